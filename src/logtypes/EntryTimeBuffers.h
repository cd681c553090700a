#ifndef ZRM_ENTRY_TIME_BUFFERS_H
#define ZRM_ENTRY_TIME_BUFFERS_H

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

} // namespace zrm

#endif
