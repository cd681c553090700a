#include "logtypes/SyslogClock.h"

#include "base/BrevanTime.h"
#include "logs/FollowSettings.h"
#include "logs/ZoneTime.h"
#include "logtypes/EntryStamp.h"

#include <algorithm>
#include <cstring>
#include <utility>

namespace zrm {

namespace {

using Form = SyslogTime::Form;

constexpr std::size_t traditionalMinute = 13; // "Mmm dd hh:mm:"
constexpr std::size_t isoMinute = 17;         // "YYYY-MM-DDThh:mm:"
constexpr std::size_t secondInStamp = 11;
constexpr unsigned lastSecond = 59;

/// The time that a line shows. If it shows no year, `newest` decides.
std::int64_t civilSeconds(const SyslogTime& time, const char* newest) noexcept {
    CivilTime civil = time.time;
    if (!time.hasYear) {
        civil.year = SyslogForms::yearOf(civil, ZoneTime::ofStamp(newest));
    }
    return civil.seconds();
}

/// False if the time has no stamp.
bool write(std::int64_t civil, const SyslogTime& time, const FollowSettings& settings,
           char* stamp) noexcept {
    const LocalEntryTime local = LocalEntryTime::of(civil, time.offset, settings.zone);
    lastEntryMoment = local.moment;
    return ZoneTime::writeStamp(local.seconds, stamp);
}

/// Where the fraction of a second ends that may begin here.
std::size_t endOfFraction(std::string_view text, std::size_t at) noexcept {
    if (at < text.size() && (text[at] == '.' || text[at] == ',')) {
        do {
            ++at;
        } while (at < text.size() && text[at] >= '0' && text[at] <= '9');
    }
    return at;
}

} // namespace

SyslogClock::SyslogClock(std::shared_ptr<const FollowSettings> settings) noexcept
    : m_settings(std::move(settings)) {}

SyslogHead SyslogClock::readOnce(std::string_view line, const FollowSettings& settings,
                                 char* newest, char* stamp) noexcept {
    const SyslogTime time = SyslogForms::recognise(line);
    if (!time.hasTime) {
        return time;
    }
    char now[stampLength];
    if (newest == nullptr) {
        BrevanTime::generateCurrentTimestamp(now);
    }
    const std::int64_t civil = civilSeconds(time, newest == nullptr ? now : newest);
    if (write(civil, time, settings, stamp) && newest != nullptr) {
        std::memcpy(newest, stamp, stampLength);
    }
    return time;
}

SyslogHead SyslogClock::read(std::string_view line, char* stamp) noexcept {
    const SyslogStart start = SyslogForms::start(line);
    const std::string_view text(line.data() + start.at, line.size() - start.at);
    if (const std::size_t length = recall(text, start.isRfc5424, stamp); length > 0) {
        return {m_form, start.at + length};
    }
    const SyslogTime time = SyslogForms::recognise(line);
    if (time.hasTime) {
        const std::time_t now = std::time(nullptr); // should a second end here, the next line asks
        char newest[stampLength];
        BrevanTime::generateCurrentTimestamp(newest);
        const std::int64_t civil = civilSeconds(time, newest);
        if (write(civil, time, *m_settings, stamp)) {
            remember(text, time, civil, now);
        }
    }
    return time;
}

/// Reads a time in the remembered minute. Returns its length with the blank behind it; 0 if the
/// text does not begin with such a time in the form and zone that are remembered.
std::size_t SyslogClock::recall(std::string_view text, bool isRfc5424, char* stamp) const noexcept {
    const bool isTraditional = m_form == Form::traditional;
    std::size_t end = isTraditional ? traditionalMinute : isoMinute;
    if (m_form == Form::none || isRfc5424 != (m_form == Form::rfc5424) || text.size() < end + 2) {
        return 0;
    }
    const char* const bytes = text.data();
    // The compiler knows both lengths and calls no function.
    if (isTraditional ? std::memcmp(bytes, m_minute, traditionalMinute) != 0
                      : std::memcmp(bytes, m_minute, isoMinute) != 0) {
        return 0;
    }
    const unsigned tens = static_cast<unsigned char>(bytes[end] - '0');
    const unsigned units = static_cast<unsigned char>(bytes[end + 1] - '0');
    const unsigned second = 10 * tens + units;
    if (units > 9 || second > lastSecond) {
        return 0;
    }
    end += 2;
    if (isTraditional) {
        if (std::time(nullptr) != m_now) {
            return 0;
        }
    } else {
        end = endOfFraction(text, end);
        if (text.size() - end < m_zoneLength ||
            std::memcmp(bytes + end, m_zone, m_zoneLength) != 0) {
            return 0;
        }
        end += m_zoneLength;
    }
    if (end < text.size() && bytes[end] != ' ') {
        return 0;
    }
    std::memcpy(stamp, m_stamp, stampLength);
    stamp[secondInStamp] = static_cast<char>('0' + tens);
    stamp[secondInStamp + 1] = static_cast<char>('0' + units);
    lastEntryMoment = {m_moment.kind, m_moment.seconds + second};
    return end < text.size() ? end + 1 : end;
}

/// Remembers the minute of a time, unless the seconds of the local time are not those of the line,
/// or a clock is changed within the minute. `text` begins with the time.
void SyslogClock::remember(std::string_view text, const SyslogTime& time, std::int64_t civil,
                           std::time_t now) noexcept {
    m_form = Form::none;
    const std::int64_t begin = civil - time.time.second;
    const LocalEntryTime first = LocalEntryTime::of(begin, time.offset, m_settings->zone);
    const LocalEntryTime last =
        LocalEntryTime::of(begin + lastSecond, time.offset, m_settings->zone);
    if (time.time.second > lastSecond || first.seconds % (lastSecond + 1) != 0 ||
        last.seconds - first.seconds != lastSecond ||
        !ZoneTime::writeStamp(first.seconds, m_stamp)) {
        return;
    }
    const bool isTraditional = time.form == Form::traditional;
    const std::size_t minute = isTraditional ? traditionalMinute : isoMinute;
    text.copy(m_minute, minute);
    if (!isTraditional) {
        const std::size_t at = endOfFraction(text, minute + 2);
        m_zoneLength = std::min(text.find(' ', at), text.size()) - at;
        if (m_zoneLength > longestZone) {
            return;
        }
        text.copy(m_zone, m_zoneLength, at);
    }
    m_now = now;
    m_moment = first.moment;
    m_form = time.form;
}

} // namespace zrm
