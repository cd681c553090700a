#ifndef ZRM_ENTRY_TIME_H
#define ZRM_ENTRY_TIME_H

namespace zrm {

/// The parts of a user log entry's time, as far as they are known.
struct EntryTime {
    static constexpr long unknown = -1;
    static constexpr int textLength = 15; ///< characters that write() must give

    long century = unknown; ///< 1 for the years 2000 to 2069, 0 for 1970 to 1999
    long year = unknown;    ///< two digits
    long month = unknown;   ///< 1 to 12
    long day = unknown;
    long hour = unknown; ///< 24 may occur
    long minute = unknown;
    long second = 0;

    bool isComplete() const noexcept {
        return year != unknown && month != unknown && day != unknown && hour != unknown &&
               minute != unknown;
    }
    /// Takes what is unknown from the current local time. False, with errno, when that cannot be
    /// told. Asks the system for the time zone once per second and thread.
    bool completeFromClock() noexcept;
    /// Writes the first 15 characters of the time stamp and returns their number; another number
    /// when the parts do not give 15, and then nothing is written.
    int write(char* out) const noexcept;

    /// The current local date: century, year, month and day; the rest unknown. False as above.
    static bool today(EntryTime& date) noexcept;
};

} // namespace zrm

#endif
