#ifndef ZRM_HOST_TIME_TEXT_H
#define ZRM_HOST_TIME_TEXT_H

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <ctime>
#include <optional>
#include <string>
#include <string_view>

namespace zrm::host {

/// The wall-clock time. The host reads it nowhere else, but for the times of trace records.
namespace WallClock {

/// Milliseconds since 1970-01-01, UTC.
inline std::int64_t now() {
    return std::chrono::duration_cast<std::chrono::milliseconds>(
               std::chrono::system_clock::now().time_since_epoch())
        .count();
}

/// Seconds since 1970-01-01, UTC.
inline std::time_t seconds() {
    return std::time(nullptr);
}

} // namespace WallClock

/// The host's times in the form that other systems read. Stateless.
class UtcTime {
public:
    /// The room that the longest text needs: bytes.
    static constexpr std::size_t mostBytes = 96;

    /// Writes a time in milliseconds since 1970-01-01 UTC, formatted as "2026-11-20T07:03:09.412Z",
    /// to room for `mostBytes`, and returns its length. Does not terminate it.
    static std::size_t write(char* out, std::int64_t milliseconds);

    /// The same at the end of a text.
    static void append(std::string& text, std::int64_t milliseconds);

    /// The same as a new text.
    static std::string text(std::int64_t milliseconds);
};

/// Durations as written by operators. Stateless.
class DurationText {
public:
    /// The duration of "60s", "5m", "1h" or "1d"; none for any other text, for zero ("0s"), and for
    /// more than 2147483647 seconds.
    static std::optional<std::chrono::seconds> parse(std::string_view text);
};

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
