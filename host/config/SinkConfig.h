#ifndef ZRM_HOST_SINK_CONFIG_H
#define ZRM_HOST_SINK_CONFIG_H

#include <chrono>
#include <cstdint>
#include <map>
#include <string>
#include <string_view>
#include <variant>

namespace zrm::host {

/// One [[sink]] of a configuration.
struct SinkConfig {
    using Texts = std::map<std::string, std::string>;
    using Value = std::variant<std::string, std::int64_t, std::chrono::milliseconds, Texts>;

    std::string type; ///< one of SinkTypes
    std::string name; ///< unique among the sinks, and the same from start to start
    /// The options of the type: those of the file and the defaults of the others. An option
    /// without a default that the file does not give is missing.
    std::map<std::string, Value, std::less<>> options;

    /// A sink of type "jsonl" that writes to this file, or to standard output ("-").
    static SinkConfig jsonl(const std::string& path);

    /// An option that is a text; empty when it is missing.
    std::string text(std::string_view option) const;
    /// An option that is a number, and has a default or is required.
    std::int64_t number(std::string_view option) const;
    /// An option that is a length of time, and has a default or is required.
    std::chrono::milliseconds duration(std::string_view option) const;
    /// An option that is a table of texts; empty when it is missing.
    Texts texts(std::string_view option) const;

    bool operator==(const SinkConfig&) const = default;
};

} // namespace zrm::host

#endif
