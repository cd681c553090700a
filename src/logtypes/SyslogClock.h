#ifndef ZRM_SYSLOG_CLOCK_H
#define ZRM_SYSLOG_CLOCK_H

#include "logs/EntryClock.h"
#include "logtypes/SyslogForms.h"

#include <cstddef>
#include <cstdint>
#include <ctime>
#include <memory>
#include <string_view>

namespace zrm {

struct FollowSettings;

/// Makes the ENTRYTIME of the lines of a followed syslog file. Remembers the minute of the last
/// line: of a line of the same minute only the second is read, and nothing is converted. One
/// thread.
class SyslogClock {
public:
    /// The settings of the log; null for a log that is not followed, which does not use the clock.
    explicit SyslogClock(std::shared_ptr<const FollowSettings> settings) noexcept;

    /// Reads the beginning of a line that has just been written. Fills the 16 characters of the
    /// stamp and sets `lastEntryMoment`; leaves both as they are if the line has no time.
    SyslogHead read(std::string_view line, char* stamp) noexcept;

    /// Does the same for any line and remembers nothing. `newest` is the stamp of the entry before,
    /// which is newer, and becomes the stamp of this one; null means the present time. Any thread.
    static SyslogHead readOnce(std::string_view line, const FollowSettings& settings, char* newest,
                               char* stamp) noexcept;

private:
    static constexpr std::size_t stampLength = 16;
    static constexpr std::size_t longestMinute = 17; ///< "YYYY-MM-DDThh:mm:"
    static constexpr std::size_t longestZone = 6;    ///< "+hh:mm"

    std::size_t recall(std::string_view text, bool isRfc5424, char* stamp) const noexcept;
    void remember(std::string_view text, const SyslogTime& time, std::int64_t civil,
                  std::time_t now) noexcept;

    const std::shared_ptr<const FollowSettings> m_settings;
    SyslogTime::Form m_form = SyslogTime::Form::none; ///< none: no minute is remembered
    char m_minute[longestMinute] = {};                ///< as the line has it, up to the second
    char m_zone[longestZone] = {};                    ///< as the line has it
    std::size_t m_zoneLength = 0;
    std::time_t m_now = 0;          ///< when the year was decided, if the lines have none
    char m_stamp[stampLength] = {}; ///< of the first second of the minute
    EntryMoment m_moment;           ///< the same
};

} // namespace zrm

#endif
