#ifndef ZRM_HOST_HOST_CONFIG_H
#define ZRM_HOST_HOST_CONFIG_H

#include "host/base/ListenAddress.h"
#include "host/config/JudgementConfig.h"
#include "host/config/LogConfig.h"
#include "host/config/SinkConfig.h"
#include "host/framework/Condition.h"

#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

/// An environment variable of the agent that the configuration sets if it is unset.
struct EnvironmentSetting {
    std::string variable;
    std::string value;
    bool operator==(const EnvironmentSetting&) const = default;
};

/// [http]
struct HttpConfig {
    std::optional<ListenAddress> listen; ///< none: no HTTP
    std::string tokenFile;               ///< empty: api-token in the state directory
    std::string certificate;             ///< empty: no TLS
    std::string key;                     ///< of the certificate
    bool operator==(const HttpConfig&) const = default;
};

/// [history]
struct HistoryConfig {
    bool enabled = true;
    std::string directory;                ///< empty: the state directory
    std::int64_t keepDays = 30;           ///< older events expire
    std::uint64_t keepEvents = 5'000'000; ///< at most this many events are kept, the newest ones
    bool operator==(const HistoryConfig&) const = default;
};

/// [[situation]]
struct SituationConfig {
    std::string name;
    std::string text;
    std::string severity;
    std::vector<Condition> conditions; ///< from `log`, `when`, `frequency` and `period`
    // As written by the operator.
    std::optional<std::string> log = std::nullopt; ///< none: every log
    std::vector<std::string> when = {};
    std::optional<std::string> frequency = std::nullopt;
    std::optional<std::string> period = std::nullopt;
    std::size_t context = 0;  ///< earlier entries of the log that its events have
    std::string runbook = {}; ///< URL of what to do about its events; empty: none
    std::map<std::string, std::string> labels = {}; ///< of its events, for their receivers
    std::string rule = {};     ///< the ready situation that it is; empty: written by the operator
    std::string ruleFile = {}; ///< of that one
    std::vector<std::string> ruleLogs = {}; ///< paths of logs that the rule is for
    JudgementConfig judgement = {};
    std::size_t patternSize = 0; ///< instructions in its regular expressions (PatternBudget)
    bool operator==(const SituationConfig&) const = default;
};

/// The contents of a host configuration file, with defaults for missing keys.
struct HostConfig {
    std::string stateDirectory = "/var/lib/zrm";
    std::vector<EnvironmentSetting> environment;
    HttpConfig http;
    HistoryConfig history;
    std::vector<SinkConfig> sinks = {SinkConfig::jsonl("-")};
    std::vector<std::string> formatDirectories; ///< with ready formats, before the usual ones
    std::vector<std::string> ruleDirectories;   ///< with ready situations, before the usual ones
    std::vector<LogConfig> logs;
    std::vector<SituationConfig> situations;
};

} // namespace zrm::host

#endif
