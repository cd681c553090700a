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

std::int64_t quarterOf(std::int64_t civil) noexcept {
    return (civil - ((civil % quarterHour) + quarterHour) % quarterHour) / quarterHour;
}

} // namespace

EntryClock::EntryClock(std::shared_ptr<const FollowSettings> settings, Reading reading) noexcept
    : m_settings(std::move(settings)), m_reading(reading),
      m_quarter(std::numeric_limits<std::int64_t>::min()) {}

/// True if the column is that of the entry before, whose time is certain.
bool EntryClock::isRepeated(const char* stamp) const noexcept {
    return std::memcmp(stamp, m_stamp, stampLength) == 0;
}

std::int64_t EntryClock::next(const EntryMoment& moment, char* stamp) noexcept {
    const bool isColumn = moment.kind == EntryMoment::Kind::column;
    m_hadTime = true;
    if (isColumn && isRepeated(stamp)) {
        m_last = m_stampTime;
        return m_stampTime;
    }
    const std::optional<Range> range = rangeOf(moment, stamp);
    if (!range) {
        m_hadTime = false;
        if (!m_last) {
            m_last = std::time(nullptr);
        }
        return *m_last;
    }
    const std::int64_t time = choose(*range);
    if (isColumn && range->earliest == range->latest) {
        std::memcpy(m_stamp, stamp, stampLength);
        m_stampTime = time;
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
        const std::int64_t time = std::clamp(moment.seconds, -farthest, farthest);
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
