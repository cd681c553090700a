#include "logtypes/EntryStamp.h"

#include "base/BrevanTime.h"
#include "logs/FollowSettings.h"
#include "logtypes/SyslogForms.h"

#include <cstring>
#include <ctime>

namespace zrm {

namespace {

constexpr std::size_t secondInStamp = 11;
constexpr unsigned lastSecond = 59;
constexpr std::int64_t secondsOfDay = 86'400;
constexpr std::int64_t mostAhead =
    3600; ///< how far an entry's time of day may be ahead, in seconds

/// By how many whole days a time must be earlier so that it is not after `latest`, and no more than
/// a day before it.
std::int64_t daysBetween(std::int64_t latest, std::int64_t time) noexcept {
    const std::int64_t ahead = time - latest;
    return ahead > 0 ? (ahead + secondsOfDay - 1) / secondsOfDay : ahead / secondsOfDay;
}

} // namespace

LocalEntryTime LocalEntryTime::of(std::int64_t civil, const std::optional<std::int32_t>& offset,
                                  const std::vector<ZoneOffset>& zone) noexcept {
    if (offset) {
        const std::int64_t utc = civil - *offset;
        return {{EntryMoment::Kind::instant, utc}, ZoneTime::toLocal(utc)};
    }
    if (!zone.empty()) {
        const std::int64_t utc = ZoneTime::toUtc(civil, zone);
        return {{EntryMoment::Kind::zoned, civil}, ZoneTime::toLocal(utc)};
    }
    return {{}, civil};
}

bool EntryStamp::write(const EntryColumns& entry, const char* newest, char* out) noexcept {
    if (isRemembered(entry)) {
        const unsigned second = entry.time.second;
        std::memcpy(out, m_stamp, stampLength);
        out[secondInStamp] = static_cast<char>('0' + second / 10);
        out[secondInStamp + 1] = static_cast<char>('0' + second % 10);
        lastEntryMoment = {m_moment.kind, m_moment.seconds + second};
        return true;
    }
    CivilTime civil = entry.time;
    if (!entry.hasYear) {
        civil.year = SyslogForms::yearOf(civil, latestTime(newest));
    }
    const std::int64_t seconds = civil.seconds();
    const LocalEntryTime time = LocalEntryTime::of(seconds, entry.offset, m_settings->zone);
    if (!ZoneTime::writeStamp(time.seconds, out)) {
        return false;
    }
    lastEntryMoment = time.moment;
    remember(entry, seconds);
    return true;
}

/// What `newest` of write() stands for, in local time.
CivilTime EntryStamp::latestTime(const char* newest) noexcept {
    char now[stampLength];
    if (newest == nullptr) {
        BrevanTime::generateCurrentTimestamp(now);
    }
    return ZoneTime::ofStamp(newest == nullptr ? now : newest);
}

bool EntryStamp::writeTimeOfDay(const EntryColumns& entry, const char* newest, char* out) noexcept {
    const std::int64_t latest = latestTime(newest).seconds() + mostAhead;
    CivilTime civil = CivilTime::of(latest);
    civil.hour = entry.time.hour;
    civil.minute = entry.time.minute;
    civil.second = entry.time.second;
    std::int64_t seconds = civil.seconds();
    LocalEntryTime time = LocalEntryTime::of(seconds, entry.offset, m_settings->zone);
    const auto moveBack = [&](std::int64_t days) {
        seconds -= days * secondsOfDay;
        time = LocalEntryTime::of(seconds, entry.offset, m_settings->zone);
    };
    // In another zone the date may be another one.
    if (const std::int64_t days = daysBetween(latest, time.seconds); days != 0) {
        moveBack(days);
    }
    if (time.seconds > latest) { // a clock was changed in between
        moveBack(1);
    }
    lastEntryMoment = time.moment;
    return ZoneTime::writeStamp(time.seconds, out);
}

bool EntryStamp::isRemembered(const EntryColumns& entry) const noexcept {
    const CivilTime& time = entry.time;
    return m_hasMinute && entry.hasYear && time.second <= lastSecond &&
           time.minute == m_minute.minute && time.hour == m_minute.hour &&
           time.day == m_minute.day && time.month == m_minute.month && time.year == m_minute.year &&
           entry.offset == m_offset;
}

/// Remembers the minute of a time with a year, unless the seconds of the local time are not those
/// of the entry, or a clock is changed within the minute.
void EntryStamp::remember(const EntryColumns& entry, std::int64_t civil) noexcept {
    m_hasMinute = false;
    if (!entry.hasYear || entry.time.second > lastSecond) {
        return;
    }
    const std::vector<ZoneOffset>& zone = m_settings->zone;
    const std::int64_t begin = civil - entry.time.second;
    const LocalEntryTime first = LocalEntryTime::of(begin, entry.offset, zone);
    const LocalEntryTime last = LocalEntryTime::of(begin + lastSecond, entry.offset, zone);
    if (first.seconds % (lastSecond + 1) == 0 && last.seconds - first.seconds == lastSecond &&
        ZoneTime::writeStamp(first.seconds, m_stamp)) {
        m_minute = entry.time;
        m_offset = entry.offset;
        m_moment = first.moment;
        m_hasMinute = true;
    }
}

void EntryStamp::writePresent(char* out) noexcept {
    lastEntryMoment = {EntryMoment::Kind::instant, std::time(nullptr)};
    BrevanTime::generateCurrentTimestamp(out);
}

} // namespace zrm
