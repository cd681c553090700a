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
    std::string name; ///< unique among the sinks, and stable across restarts
    /// The options of the type: from the file, or their defaults. An option that is neither in the
    /// file nor has a default is missing.
    std::map<std::string, Value, std::less<>> options;

    /// A sink of type "jsonl" that writes to this file, or to standard output ("-").
    static SinkConfig jsonl(const std::string& path);

    /// A text option; empty when missing.
    std::string text(std::string_view option) const;
    /// A numeric option that has a default or is required.
    std::int64_t number(std::string_view option) const;
    /// A duration option that has a default or is required.
    std::chrono::milliseconds duration(std::string_view option) const;
    /// An option that is a table of texts; empty when missing.
    Texts texts(std::string_view option) const;

    bool operator==(const SinkConfig&) const = default;
};

} // namespace zrm::host

#endif
