#include "logs/ZoneTime.h"

#include "base/DigitPairs.h"
#include "logs/FollowSettings.h"

#include <algorithm>
#include <chrono>
#include <cstring>
#include <ctime>
#include <limits>

namespace zrm {

namespace {

using std::chrono::sys_days;
using std::chrono::year_month_day;

constexpr std::int64_t daySeconds = 86'400;
/// Clocks are changed at such times only.
constexpr std::int64_t quarterHour = 900;

/// What the thread found out last.
struct LocalOffset {
    std::int64_t quarter = std::numeric_limits<std::int64_t>::min();
    std::int64_t seconds = 0;
};

constinit thread_local LocalOffset localOffset;

std::int64_t floorDivide(std::int64_t number, std::int64_t divisor) noexcept {
    const std::int64_t quotient = number / divisor;
    return number % divisor < 0 ? quotient - 1 : quotient;
}

year_month_day dayOf(const CivilTime& time) noexcept {
    return {std::chrono::year(time.year), std::chrono::month(time.month),
            std::chrono::day(time.day)};
}

/// The difference of local time from UTC at this UTC time.
std::int64_t localOffsetAt(std::int64_t utc) noexcept {
    const auto time = static_cast<std::time_t>(utc);
    std::tm local;
    if (localtime_r(&time, &local) == nullptr) {
        return 0;
    }
    const CivilTime civil{local.tm_year + 1900,
                          static_cast<unsigned>(local.tm_mon) + 1,
                          static_cast<unsigned>(local.tm_mday),
                          static_cast<unsigned>(local.tm_hour),
                          static_cast<unsigned>(local.tm_min),
                          static_cast<unsigned>(local.tm_sec)};
    return civil.seconds() - utc;
}

/// The same for a zone, which is local time if it has no offsets.
std::int64_t offsetAt(std::int64_t utc, const std::vector<ZoneOffset>& zone) noexcept {
    if (zone.empty()) {
        return localOffsetAt(utc);
    }
    const auto later = std::upper_bound(
        zone.begin(), zone.end(), utc,
        [](std::int64_t time, const ZoneOffset& offset) { return time < offset.since; });
    return later == zone.begin() ? later->seconds : (later - 1)->seconds;
}

/// A two-digit number at a place of the text; -1 if there is none.
int pairAt(std::string_view text, std::size_t at) noexcept {
    const auto digit = [&](std::size_t place) {
        return place < text.size() && text[place] >= '0' && text[place] <= '9' ? text[place] - '0'
                                                                               : -1;
    };
    const int tens = digit(at);
    const int units = digit(at + 1);
    return tens < 0 || units < 0 ? -1 : tens * 10 + units;
}

} // namespace

bool CivilTime::isValid() const noexcept {
    return dayOf(*this).ok() && hour < 24 && minute < 60 && second <= 60;
}

std::int64_t CivilTime::seconds() const noexcept {
    const std::int64_t days = sys_days(dayOf(*this)).time_since_epoch().count();
    return days * daySeconds + hour * 3600 + minute * 60 + second;
}

CivilTime CivilTime::of(std::int64_t seconds) noexcept {
    const std::int64_t days = floorDivide(seconds, daySeconds);
    const year_month_day day{sys_days(std::chrono::days(days))};
    const auto rest = static_cast<unsigned>(seconds - days * daySeconds);
    return {static_cast<int>(day.year()),
            static_cast<unsigned>(day.month()),
            static_cast<unsigned>(day.day()),
            rest / 3600,
            rest / 60 % 60,
            rest % 60};
}

std::optional<std::int32_t> ZoneTime::takeOffset(std::string_view& text) noexcept {
    if (text.starts_with('Z') || text.starts_with('z')) {
        text.remove_prefix(1);
        return 0;
    }
    if (!text.starts_with('+') && !text.starts_with('-')) {
        return std::nullopt;
    }
    const int hours = pairAt(text, 1);
    const bool hasColon = text.size() > 3 && text[3] == ':';
    const int minutes = pairAt(text, hasColon ? 4 : 3);
    if (hours < 0 || hours > 23 || minutes > 59 || (hasColon && minutes < 0)) {
        return std::nullopt;
    }
    const int seconds = hours * 3600 + std::max(minutes, 0) * 60;
    const int sign = text[0] == '-' ? -1 : 1;
    text.remove_prefix(minutes < 0 ? 3 : hasColon ? 6 : 5);
    return sign * seconds;
}

std::int64_t ZoneTime::toUtc(std::int64_t civil, const std::vector<ZoneOffset>& zone) noexcept {
    // The last offset that was in force before the time can be of another day's, at most.
    const auto later = std::upper_bound(
        zone.begin(), zone.end(), civil - daySeconds,
        [](std::int64_t time, const ZoneOffset& offset) { return time < offset.since; });
    auto current = later == zone.begin() ? later : later - 1;
    while (current + 1 != zone.end() && civil - current->seconds >= (current + 1)->since) {
        ++current;
    }
    return civil - current->seconds;
}

ZoneTime::UtcTimes ZoneTime::utcTimes(std::int64_t civil,
                                      const std::vector<ZoneOffset>& zone) noexcept {
    // Offsets differ by less than a day, and changes are further apart than two.
    const std::int64_t before = offsetAt(civil - daySeconds, zone);
    const std::int64_t after = offsetAt(civil + daySeconds, zone);
    const std::int64_t first = civil - before;
    const std::int64_t second = civil - after;
    if (before == after || offsetAt(second, zone) != after) {
        return {first, first};
    }
    return offsetAt(first, zone) == before ? UtcTimes{first, second} : UtcTimes{second, second};
}

std::int64_t ZoneTime::toLocal(std::int64_t utc) noexcept {
    const std::int64_t quarter = floorDivide(utc, quarterHour);
    if (quarter != localOffset.quarter) {
        localOffset = {quarter, localOffsetAt(quarter * quarterHour)};
    }
    return utc + localOffset.seconds;
}

bool ZoneTime::writeStamp(std::int64_t civil, char* out) noexcept {
    const CivilTime time = CivilTime::of(civil);
    const int years = time.year - 1900;
    if (years < 0 || years > 999) {
        return false;
    }
    *out = static_cast<char>('0' + years / 100);
    const unsigned pairs[] = {static_cast<unsigned>(years % 100),
                              time.month,
                              time.day,
                              time.hour,
                              time.minute,
                              time.second};
    for (std::size_t index = 0; index < std::size(pairs); ++index) {
        DigitPairs::put(out + 1 + 2 * index, pairs[index]);
    }
    std::memcpy(out + 13, "000", 3);
    return true;
}

CivilTime ZoneTime::ofStamp(const char* stamp) noexcept {
    const auto pair = [stamp](std::size_t at) {
        return static_cast<unsigned>((stamp[at] - '0') * 10 + (stamp[at + 1] - '0'));
    };
    return {1900 + (stamp[0] - '0') * 100 + static_cast<int>(pair(1)),
            pair(3),
            pair(5),
            pair(7),
            pair(9),
            pair(11)};
}

} // namespace zrm
