#include "host/base/TimeText.h"

#include <array>
#include <charconv>
#include <cstdint>
#include <cstdio>
#include <ctime>
#include <limits>
#include <system_error>

namespace zrm::host {

namespace {

std::size_t writeUnusual(char* out, const std::tm& utc, int millisecond) {
    return static_cast<std::size_t>(std::snprintf(
        out, UtcTime::mostBytes, "%04d-%02d-%02dT%02d:%02d:%02d.%03dZ", utc.tm_year + 1900,
        utc.tm_mon + 1, utc.tm_mday, utc.tm_hour, utc.tm_min, utc.tm_sec, millisecond));
}

} // namespace

std::size_t UtcTime::write(char* out, std::int64_t milliseconds) {
    const auto seconds = static_cast<std::time_t>(milliseconds / 1000);
    std::tm utc{};
    gmtime_r(&seconds, &utc);
    const int year = utc.tm_year + 1900;
    const auto millisecond = static_cast<int>(milliseconds % 1000);
    if (year < 0 || year > 9999 || millisecond < 0) {
        return writeUnusual(out, utc, millisecond);
    }
    constexpr std::string_view stamp = "0000-00-00T00:00:00.000Z";
    stamp.copy(out, stamp.size()); // called for every event, so without a format string
    const auto put = [out](std::size_t end, int number) {
        for (; number > 0; number /= 10) {
            out[--end] = static_cast<char>('0' + number % 10);
        }
    };
    put(4, year);
    put(7, utc.tm_mon + 1);
    put(10, utc.tm_mday);
    put(13, utc.tm_hour);
    put(16, utc.tm_min);
    put(19, utc.tm_sec);
    put(23, millisecond);
    return stamp.size();
}

void UtcTime::append(std::string& text, std::int64_t milliseconds) {
    char buffer[mostBytes];
    text.append(buffer, write(buffer, milliseconds));
}

std::string UtcTime::text(std::int64_t milliseconds) {
    std::string text;
    append(text, milliseconds);
    return text;
}

std::optional<std::chrono::seconds> DurationText::parse(std::string_view text) {
    struct Unit {
        std::string_view name;
        std::int64_t seconds;
    };
    static constexpr std::array<Unit, 4> units = {{{"s", 1}, {"m", 60}, {"h", 3600}, {"d", 86400}}};
    constexpr std::int64_t longest = std::numeric_limits<std::int32_t>::max();
    std::int64_t number = 0;
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (error != std::errc() || number < 1) {
        return std::nullopt;
    }
    text.remove_prefix(static_cast<std::size_t>(end - text.data()));
    for (const Unit& unit : units) {
        if (text == unit.name && number <= longest / unit.seconds) {
            return std::chrono::seconds(number * unit.seconds);
        }
    }
    return std::nullopt;
}

namespace {

struct Moment {
    int year = 0, month = 1, day = 1, hour = 0, minute = 0, second = 0;
};

bool isDigit(char c) {
    return c >= '0' && c <= '9';
}

/// Removes exactly `digits` digits from the beginning of the text.
bool takeNumber(std::string_view& text, std::size_t digits, int& number) {
    if (text.size() < digits) {
        return false;
    }
    number = 0;
    for (const char c : text.substr(0, digits)) {
        if (!isDigit(c)) {
            return false;
        }
        number = number * 10 + (c - '0');
    }
    text.remove_prefix(digits);
    return true;
}

bool take(std::string_view& text, char c) {
    if (text.empty() || text.front() != c) {
        return false;
    }
    text.remove_prefix(1);
    return true;
}

int daysOf(int year, int month) {
    static constexpr std::array days = {31, 28, 31, 30, 31, 30, 31, 31, 30, 31, 30, 31};
    const bool isLeap = (year % 4 == 0 && year % 100 != 0) || year % 400 == 0;
    return month == 2 && isLeap ? 29 : days[static_cast<std::size_t>(month - 1)];
}

/// A second of 60 is a leap second.
bool isValid(const Moment& at) {
    return at.year >= 1900 && at.year <= 2099 && at.month >= 1 && at.month <= 12 && at.day >= 1 &&
           at.day <= daysOf(at.year, at.month) && at.hour <= 23 && at.minute <= 59 &&
           at.second <= 60;
}

std::string stamp(const Moment& at) {
    char text[48];
    std::snprintf(text, sizeof text, "%d%02d%02d%02d%02d%02d%02d000", at.year / 100 - 19,
                  at.year % 100, at.month, at.day, at.hour, at.minute, at.second);
    return text;
}

bool takeDate(std::string_view& text, Moment& at) {
    return takeNumber(text, 4, at.year) && take(text, '-') && takeNumber(text, 2, at.month) &&
           take(text, '-') && takeNumber(text, 2, at.day);
}

bool takeTime(std::string_view& text, Moment& at) {
    if (!takeNumber(text, 2, at.hour) || !take(text, ':') || !takeNumber(text, 2, at.minute)) {
        return false;
    }
    if (!take(text, ':')) {
        return true;
    }
    if (!takeNumber(text, 2, at.second)) {
        return false;
    }
    if (take(text, '.')) {
        if (text.empty() || !isDigit(text.front())) {
            return false;
        }
        while (!text.empty() && isDigit(text.front())) {
            text.remove_prefix(1);
        }
    }
    return true;
}

/// "Z", "+hh:mm", "+hhmm" or "+hh", as seconds east of UTC.
bool takeZone(std::string_view& text, long& east) {
    if (take(text, 'Z')) {
        east = 0;
        return true;
    }
    const int sign = take(text, '+') ? 1 : take(text, '-') ? -1 : 0;
    int hours = 0;
    int minutes = 0;
    if (sign == 0 || !takeNumber(text, 2, hours) || hours > 23) {
        return false;
    }
    const bool hasColon = take(text, ':');
    if ((hasColon || !text.empty()) && (!takeNumber(text, 2, minutes) || minutes > 59)) {
        return false;
    }
    east = sign * (hours * 3600L + minutes * 60L);
    return true;
}

/// Days from 1970-01-01 to a date of the Gregorian calendar.
long daysSinceEpoch(int year, int month, int day) {
    const long shifted = month > 2 ? year : year - 1L;
    const long era = shifted / 400;
    const long yearOfEra = shifted - era * 400;
    const long dayOfYear = (153L * (month + (month > 2 ? -3 : 9)) + 2) / 5 + day - 1;
    return era * 146097 + yearOfEra * 365 + yearOfEra / 4 - yearOfEra / 100 + dayOfYear - 719468;
}

std::time_t secondsOf(const Moment& at, long east) {
    return daysSinceEpoch(at.year, at.month, at.day) * 86400L + at.hour * 3600L + at.minute * 60L +
           at.second - east;
}

std::optional<Moment> toLocal(const Moment& at, long east) {
    const std::time_t time = secondsOf(at, east);
    std::tm local{};
    if (localtime_r(&time, &local) == nullptr) {
        return std::nullopt;
    }
    return Moment{local.tm_year + 1900, local.tm_mon + 1, local.tm_mday,
                  local.tm_hour,        local.tm_min,     local.tm_sec};
}

std::time_t localSecondsOf(const Moment& at) {
    std::tm local{};
    local.tm_year = at.year - 1900;
    local.tm_mon = at.month - 1;
    local.tm_mday = at.day;
    local.tm_hour = at.hour;
    local.tm_min = at.minute;
    local.tm_sec = at.second;
    local.tm_isdst = -1;
    return std::mktime(&local);
}

/// The fraction of the second in milliseconds; 0 without one.
int fractionOf(std::string_view text) {
    const std::size_t point = text.find('.');
    int milliseconds = 0;
    for (std::size_t digit = 1; point != std::string_view::npos && digit <= 3; ++digit) {
        const bool has = point + digit < text.size() && isDigit(text[point + digit]);
        milliseconds = milliseconds * 10 + (has ? text[point + digit] - '0' : 0);
    }
    return milliseconds;
}

/// An ISO 8601 time with its zone, if any, in seconds east of UTC.
struct Iso {
    Moment at;
    std::optional<long> east = std::nullopt;
};

std::optional<Iso> parseIso(std::string_view text) {
    Iso iso;
    if (!takeDate(text, iso.at)) {
        return std::nullopt;
    }
    if (!text.empty() && ((!take(text, 'T') && !take(text, ' ')) || !takeTime(text, iso.at))) {
        return std::nullopt;
    }
    if (!isValid(iso.at)) {
        return std::nullopt;
    }
    if (!text.empty()) {
        long east = 0;
        if (!takeZone(text, east) || !text.empty()) {
            return std::nullopt;
        }
        iso.east = east;
    }
    return iso;
}

bool isStamp(std::string_view text) {
    return text.size() == 16 && text.find_first_not_of("0123456789") == std::string_view::npos;
}

/// The moment of a time stamp; none when it is not a time.
std::optional<Moment> momentOf(std::string_view text) {
    Moment at;
    int century = 0;
    int thousandths = 0;
    if (!takeNumber(text, 1, century) || century > 1 || !takeNumber(text, 2, at.year) ||
        !takeNumber(text, 2, at.month) || !takeNumber(text, 2, at.day) ||
        !takeNumber(text, 2, at.hour) || !takeNumber(text, 2, at.minute) ||
        !takeNumber(text, 2, at.second) || !takeNumber(text, 3, thousandths)) {
        return std::nullopt;
    }
    at.year += 1900 + 100 * century;
    return isValid(at) ? std::optional(at) : std::nullopt;
}

} // namespace

std::optional<std::string> TimeText::toStamp(std::string_view text) {
    if (isStamp(text)) {
        const bool isUnknownTime = text == "0000000000000000";
        return isUnknownTime || momentOf(text) ? std::optional(std::string(text)) : std::nullopt;
    }
    const std::optional<Iso> iso = parseIso(text);
    if (!iso) {
        return std::nullopt;
    }
    if (!iso->east) {
        return stamp(iso->at);
    }
    const std::optional<Moment> local = toLocal(iso->at, *iso->east);
    return local && isValid(*local) ? std::optional(stamp(*local)) : std::nullopt;
}

std::optional<std::int64_t> TimeText::toMilliseconds(std::string_view text) {
    constexpr std::int64_t second = 1000;
    if (isStamp(text)) {
        const std::optional<Moment> at = momentOf(text);
        return at ? std::optional(localSecondsOf(*at) * second) : std::nullopt;
    }
    const std::optional<Iso> iso = parseIso(text);
    if (!iso) {
        return std::nullopt;
    }
    const std::time_t seconds =
        iso->east ? secondsOf(iso->at, *iso->east) : localSecondsOf(iso->at);
    return seconds * second + fractionOf(text);
}

} // namespace zrm::host
