#ifndef ZRM_HOST_TIME_TEXT_H
#define ZRM_HOST_TIME_TEXT_H

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace zrm::host {

/// Times as operators write them. Stateless.
class TimeText {
public:
    /// The 16-character time stamp of a time that is written as one already, or as ISO 8601: a
    /// date, or a date and a time ("T" or a blank between them, seconds optional, a fraction is
    /// dropped), local or with "Z" or an offset behind it. None when it is neither, or before
    /// 1900 or after 2099. Any thread.
    static std::optional<std::string> toStamp(std::string_view text);

    /// The same time in milliseconds since 1970-01-01 UTC, with its fraction. Any thread.
    static std::optional<std::int64_t> toMilliseconds(std::string_view text);
};

} // namespace zrm::host

#endif
