#ifndef ZRM_HOST_SINK_TYPES_H
#define ZRM_HOST_SINK_TYPES_H

#include <array>
#include <cstdint>
#include <span>
#include <string_view>

namespace zrm::host {

/// The facilities of RFC 5424 by their usual names; the index is the code.
inline constexpr std::array<std::string_view, 24> syslogFacilities = {
    "kern",   "user",   "mail",     "daemon", "auth",   "syslog", "lpr",    "news",
    "uucp",   "cron",   "authpriv", "ftp",    "ntp",    "audit",  "alert",  "clock",
    "local0", "local1", "local2",   "local3", "local4", "local5", "local6", "local7"};

/// Whether an operator may add a header of this name to those that a sink sets.
bool isAddableHeader(std::string_view name);

/// Whether the value of this header is usually a secret, as for Authorization.
bool isSecretHeader(std::string_view name);

/// One key of a [[sink]]: what the reader of configurations accepts and what the documentation
/// says.
struct SinkOption {
    /// What its value is, and so how it is read and checked.
    enum class Kind {
        TEXT,       ///< of at most `bound` bytes
        NUMBER,     ///< within the bounds
        DURATION,   ///< "10s"; within the bounds, which are seconds
        CHOICE,     ///< one of the choices
        URL,        ///< of something that is asked over HTTP
        ADDRESS,    ///< HOST:PORT
        PATH,       ///< of a file
        OUTPUT,     ///< the path of a file, or "-"
        HEADERS,    ///< a table of HTTP headers
        LABELS,     ///< a table of texts with names as metrics have them
        ATTRIBUTES, ///< a table of texts with any names
    };
    using enum Kind;
    enum class Need { REQUIRED, OPTIONAL };
    using enum Need;

    std::string_view name;
    Kind kind;
    Need need;
    std::string_view value;   ///< as a file has it: the default, or an example of what is required
    std::string_view meaning; ///< one line
    std::int64_t least = 0;
    std::int64_t most = 0;
    std::span<const std::string_view> choices = {};
    std::string_view instead = {}; ///< the option that excludes this one
};

/// One type of sinks.
struct SinkType {
    std::string_view name;
    std::string_view meaning; ///< one line
    std::string_view target;  ///< the required option that says where the events go
    std::span<const SinkOption> options;
};

/// The table of all types of sinks and their options. Any thread.
class SinkTypes {
public:
    /// The keys that sinks of every type have: type and name.
    static std::span<const SinkOption> common() noexcept;

    static std::span<const SinkType> all() noexcept;

    /// The type of this name, or null.
    static const SinkType* find(std::string_view name) noexcept;
};

} // namespace zrm::host

#endif
