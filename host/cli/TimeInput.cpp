#include "host/cli/TimeInput.h"

#include "host/base/TimeText.h"

#include <array>
#include <charconv>

namespace zrm::host {

namespace {

struct Unit {
    char letter;
    long seconds;
};

constexpr std::array<Unit, 5> units = {
    {{'s', 1}, {'m', 60}, {'h', 3600}, {'d', 86400}, {'w', 604800}}};

std::string iso(std::time_t when) {
    std::tm utc{};
    gmtime_r(&when, &utc);
    char text[32];
    const std::size_t length = std::strftime(text, sizeof text, "%Y-%m-%dT%H:%M:%SZ", &utc);
    return {text, length};
}

/// A time of day on the day `daysBefore` days before that of `now`.
std::string onDay(std::time_t now, int daysBefore, int hour, int minute, int second) {
    std::tm local{};
    localtime_r(&now, &local);
    local.tm_mday -= daysBefore;
    local.tm_hour = hour;
    local.tm_min = minute;
    local.tm_sec = second;
    local.tm_isdst = -1; // let mktime determine DST for that day
    return iso(std::mktime(&local));
}

std::optional<std::string> before(std::string_view text, std::time_t now) {
    constexpr long longest = 10'000'000; ///< of any unit
    long count = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), count);
    if (error != std::errc() || end + 1 != text.data() + text.size() || count < 0 ||
        count > longest) {
        return std::nullopt;
    }
    for (const Unit& unit : units) {
        if (unit.letter == *end) {
            const std::time_t when = now - count * unit.seconds;
            return when >= 0 ? std::optional(iso(when)) : std::nullopt;
        }
    }
    return std::nullopt;
}

/// The two-digit number below the limit at the position; -1 when there is none.
int twoDigits(std::string_view text, std::size_t at, int limit) {
    int value = -1;
    const char* const end = text.data() + at + 2;
    const auto [stop, error] = std::from_chars(text.data() + at, end, value);
    return error == std::errc() && stop == end && value >= 0 && value < limit ? value : -1;
}

std::optional<std::string> clock(std::string_view text, std::time_t now) {
    const bool hasSeconds = text.size() == 8;
    if ((!hasSeconds && text.size() != 5) || text[2] != ':' || (hasSeconds && text[5] != ':')) {
        return std::nullopt;
    }
    const int hour = twoDigits(text, 0, 24);
    const int minute = twoDigits(text, 3, 60);
    const int second = hasSeconds ? twoDigits(text, 6, 60) : 0;
    if (hour < 0 || minute < 0 || second < 0) {
        return std::nullopt;
    }
    return onDay(now, 0, hour, minute, second);
}

} // namespace

std::optional<std::string> TimeInput::toIso(std::string_view text, std::time_t now) {
    if (text == "now") {
        return iso(now);
    }
    if (text == "today" || text == "yesterday") {
        return onDay(now, text == "today" ? 0 : 1, 0, 0, 0);
    }
    if (text.starts_with('-')) {
        return before(text.substr(1), now);
    }
    if (std::optional<std::string> time = clock(text, now)) {
        return time;
    }
    return TimeText::toStamp(text) ? std::optional(std::string(text)) : std::nullopt;
}

} // namespace zrm::host
