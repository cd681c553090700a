#ifndef ZRM_HOST_TIME_TEXT_H
#define ZRM_HOST_TIME_TEXT_H

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace zrm::host {

/// Times as written by operators. Stateless.
class TimeText {
public:
    /// The 16-character time stamp of a time written as a time stamp or as ISO 8601: a date, or a
    /// date and a time (separated by "T" or a blank, seconds optional, any fraction dropped), local
    /// or followed by "Z" or an offset. None when it is neither, or before 1900 or after 2099. Any
    /// thread.
    static std::optional<std::string> toStamp(std::string_view text);

    /// The same time in milliseconds since 1970-01-01 UTC, with its fraction. Any thread.
    static std::optional<std::int64_t> toMilliseconds(std::string_view text);
};

} // namespace zrm::host

#endif
