#ifndef ZRM_ENTRY_TIME_H
#define ZRM_ENTRY_TIME_H

namespace zrm {

/// The texts of one entry's time fields, terminated. A field missing from the entry is empty.
struct _EntryTimeBuffers {
    static constexpr int room = 7;      ///< characters per field
    static constexpr int zoneRoom = 31; ///< of the zone, which may follow a fraction of a second

    char year[room + 1];
    char month[room + 1];
    char day[room + 1];
    char hour[room + 1];
    char minute[room + 1];
    char second[room + 1];
    char zone[zoneRoom + 1] = {}; ///< only of a log that is followed
};

/// The known parts of a user log entry's time.
struct EntryTime {
    static constexpr long unknown = -1;
    static constexpr int textLength = 15; ///< characters that write() must produce

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
    /// Fills unknown parts from the current local time. Returns false and sets errno if the time is
    /// unavailable. Looks up the time zone once per second and thread.
    bool completeFromClock() noexcept;
    /// Writes the first 15 characters of the time stamp and returns 15. If the parts do not format
    /// to 15 characters, returns that other length and writes nothing.
    int write(char* out) const noexcept;

    /// The current local date: century, year, month and day, the rest unknown. False as above.
    static bool today(EntryTime& date) noexcept;
};

} // namespace zrm

#endif
