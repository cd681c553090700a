#include "logs/EntryClock.h"

#include "logs/FollowSettings.h"
#include "logs/ZoneTime.h"

#include <algorithm>
#include <cstring>
#include <ctime>
#include <limits>
#include <utility>

namespace zrm {

namespace {

constexpr std::size_t stampLength = 16;
constexpr std::size_t secondInStamp = 11;
constexpr std::size_t behindSecond = 13;
constexpr unsigned lastSecond = 59;
constexpr std::int64_t quarterHour = 900;
constexpr std::int64_t minute = 60;
constexpr std::int64_t mostLate = 600; ///< how much a line may be late, in seconds
/// No entry is further away from 1970, in seconds, so that no arithmetic overflows.
constexpr std::int64_t farthest = std::int64_t{1} << 40;

const std::vector<ZoneOffset> localTime; ///< has no offsets of its own

bool isStamp(const char* stamp) noexcept {
    return std::all_of(stamp, stamp + stampLength,
                       [](char character) { return character >= '0' && character <= '9'; });
}

/// The second that a stamp shows. More than 59 if it shows none, or a leap second.
unsigned secondOf(const char* stamp) noexcept {
    const unsigned tens = static_cast<unsigned char>(stamp[secondInStamp] - '0');
    const unsigned units = static_cast<unsigned char>(stamp[secondInStamp + 1] - '0');
    return units > 9 ? lastSecond + 1 : 10 * tens + units;
}

std::int64_t withinRange(std::int64_t time) noexcept {
    return std::clamp(time, -farthest, farthest);
}

std::int64_t quarterOf(std::int64_t civil) noexcept {
    return (civil - ((civil % quarterHour) + quarterHour) % quarterHour) / quarterHour;
}

} // namespace

EntryClock::EntryClock(std::shared_ptr<const FollowSettings> settings, Reading reading) noexcept
    : m_settings(std::move(settings)), m_reading(reading),
      m_quarter(std::numeric_limits<std::int64_t>::min()) {}

/// True if the stamp shows the remembered minute.
bool EntryClock::isInMinute(const char* stamp) const noexcept {
    return std::memcmp(stamp, m_minute, secondInStamp) == 0 &&
           std::memcmp(stamp + behindSecond, m_minute + behindSecond, stampLength - behindSecond) ==
               0;
}

/// Remembers the minute of a stamp that has only this time. A minute is within a quarter of an
/// hour, so that its other seconds have only one time, too.
void EntryClock::rememberMinute(const char* stamp, std::int64_t time) noexcept {
    const unsigned second = secondOf(stamp);
    if (second <= lastSecond) {
        std::memcpy(m_minute, stamp, stampLength);
        m_minuteTime = time - second;
    }
}

std::int64_t EntryClock::next(const EntryMoment& moment, char* stamp) noexcept {
    m_hadTime = true;
    if (moment.kind == EntryMoment::Kind::instant) {
        m_last = withinRange(moment.seconds);
        return *m_last;
    }
    if (moment.kind == EntryMoment::Kind::column) {
        const unsigned second = secondOf(stamp);
        if (second <= lastSecond && isInMinute(stamp)) {
            m_last = m_minuteTime + second;
            return *m_last;
        }
    }
    return find(moment, stamp);
}

/// The same for a time that has to be looked up. Apart from the function that runs for each entry.
[[gnu::noinline]] std::int64_t EntryClock::find(const EntryMoment& moment, char* stamp) noexcept {
    const std::optional<Range> range = rangeOf(moment, stamp);
    if (!range) {
        m_hadTime = false;
        if (!m_last) {
            m_last = std::time(nullptr);
        }
        return *m_last;
    }
    const std::int64_t time = choose(*range);
    if (moment.kind == EntryMoment::Kind::column && range->earliest == range->latest) {
        rememberMinute(stamp, time);
    }
    if (time != range->earliest && moment.kind == EntryMoment::Kind::zoned) {
        ZoneTime::writeStamp(ZoneTime::toLocal(time), stamp);
    }
    m_last = time;
    return time;
}

std::optional<EntryClock::Range> EntryClock::rangeOf(const EntryMoment& moment,
                                                     const char* stamp) noexcept {
    if (moment.kind == EntryMoment::Kind::instant) {
        const std::int64_t time = withinRange(moment.seconds);
        return Range{time, time};
    }
    const bool isZoned = moment.kind == EntryMoment::Kind::zoned;
    if (!isZoned && !isStamp(stamp)) {
        return std::nullopt;
    }
    const std::int64_t civil = isZoned ? moment.seconds : ZoneTime::ofStamp(stamp).seconds();
    const std::int64_t quarter = quarterOf(civil);
    if (quarter != m_quarter || isZoned != m_isZoned) {
        const std::int64_t begin = quarter * quarterHour;
        const ZoneTime::UtcTimes times =
            ZoneTime::utcTimes(begin, isZoned && m_settings ? m_settings->zone : localTime);
        m_quarter = quarter;
        m_isZoned = isZoned;
        m_first = times.first - begin;
        m_second = times.second - begin;
    }
    return Range{civil + m_first, civil + m_second};
}

/// Of two times the one that has just been, by the clock; else the first one that is not before
/// the last entry, and in the other direction the last one that is not after it.
std::int64_t EntryClock::choose(const Range& range) const noexcept {
    if (range.earliest == range.latest) {
        return range.earliest;
    }
    const std::int64_t now = std::time(nullptr);
    if (range.latest > now + minute) {
        return range.earliest;
    }
    if (range.latest >= now - minute) {
        return range.latest;
    }
    if (m_reading == Reading::backward) {
        return !m_last || range.latest <= *m_last + mostLate ? range.latest : range.earliest;
    }
    return !m_last || range.earliest >= *m_last - mostLate ? range.earliest : range.latest;
}

} // namespace zrm
