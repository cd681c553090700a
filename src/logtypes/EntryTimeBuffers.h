#ifndef ZRM_ENTRY_TIME_BUFFERS_H
#define ZRM_ENTRY_TIME_BUFFERS_H

/// The texts of one entry's time fields, terminated; an empty one was not in the entry.
struct _EntryTimeBuffers {
    static constexpr int ROOM = 7; ///< characters of each

    char year[ROOM + 1];
    char month[ROOM + 1];
    char day[ROOM + 1];
    char hour[ROOM + 1];
    char minute[ROOM + 1];
    char second[ROOM + 1];
};

#endif
