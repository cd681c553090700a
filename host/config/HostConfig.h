#ifndef ZRM_HOST_HOST_CONFIG_H
#define ZRM_HOST_HOST_CONFIG_H

#include "host/base/ListenAddress.h"
#include "host/config/SinkConfig.h"
#include "host/framework/Condition.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

/// An environment variable of the agent that the configuration sets where it is unset.
struct EnvironmentSetting {
    std::string variable;
    std::string value;
    bool operator==(const EnvironmentSetting&) const = default;
};

/// [http]
struct HttpConfig {
    std::optional<ListenAddress> listen; ///< none: no HTTP
    std::string tokenFile;               ///< empty: api-token in the state directory
    std::string certificate;             ///< empty: without TLS
    std::string key;                     ///< of the certificate
    bool operator==(const HttpConfig&) const = default;
};

/// [history]
struct HistoryConfig {
    bool enabled = true;
    std::string directory;                ///< empty: the state directory
    std::int64_t keepDays = 30;           ///< older events expire
    std::uint64_t keepEvents = 5'000'000; ///< so many of the newest events are kept at most
    bool operator==(const HistoryConfig&) const = default;
};

/// [[situation]]
struct SituationConfig {
    std::string name;
    std::string text;
    std::string severity;
    std::vector<Condition> conditions; ///< those of `log`, `when`, `frequency` and `period`
    // As they were written.
    std::optional<std::string> log = std::nullopt; ///< none: every log
    std::vector<std::string> when = {};
    std::optional<std::string> frequency = std::nullopt;
    std::optional<std::string> period = std::nullopt;
    std::size_t patternSize = 0; ///< instructions of its regular expressions (PatternBudget)
    bool operator==(const SituationConfig&) const = default;
};

/// A host configuration file as it was read; the defaults where it says nothing.
struct HostConfig {
    std::string stateDirectory = "/var/lib/zrm";
    std::vector<EnvironmentSetting> environment;
    HttpConfig http;
    HistoryConfig history;
    std::vector<SinkConfig> sinks = {SinkConfig::jsonl("-")};
    std::vector<SituationConfig> situations;
};

} // namespace zrm::host

#endif
