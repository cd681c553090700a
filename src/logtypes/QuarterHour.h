#ifndef ZRM_QUARTER_HOUR_H
#define ZRM_QUARTER_HOUR_H

#include <cstdint>

namespace zrm {

/// Generates time stamps for times that are close together. Asks the system for the local time once
/// per quarter of an hour, within which only the minute and second change. While the flow of
/// operations is traced, every stamp is an operation of BrevanTime. One thread.
class QuarterHour {
public:
    /// Same as BrevanTime::generateTimestamp.
    void generateTimestamp(std::int64_t time, char* out);

private:
    void enter(std::int64_t time);

    std::int64_t m_start = 0;  ///< a multiple of 900
    std::int64_t m_end = 0;    ///< 900 later; equal to the start if no quarter was entered
    bool m_isRegular = false;  ///< the local time does not jump within it
    unsigned m_generation = 0; ///< of the trace levels when it was entered
    char m_hour[9];            ///< CYYMMDDhh
    int m_secondOfHour = 0;    ///< at the start
};

} // namespace zrm

#endif
