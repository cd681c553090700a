#ifndef ZRM_QUARTER_HOUR_H
#define ZRM_QUARTER_HOUR_H

#include <cstdint>

namespace zrm {

/// Makes time stamps of times that lie close together: asks the system for the local time once per
/// quarter of an hour, within which only minute and second change. One thread.
class QuarterHour {
public:
    /// As BrevanTime::generateTimestamp.
    void generateTimestamp(std::int64_t time, char* out);

private:
    void enter(std::int64_t time);

    std::int64_t m_start = 0; ///< a multiple of 900
    std::int64_t m_end = 0;   ///< 900 later; the start when none was entered
    bool m_isRegular = false; ///< the local time runs through it without a leap
    char m_hour[9];           ///< CYYMMDDhh
    int m_secondOfHour = 0;   ///< at its start
};

} // namespace zrm

#endif
