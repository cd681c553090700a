#ifndef ZRM_ENTRY_TIME_BUFFERS_H
#define ZRM_ENTRY_TIME_BUFFERS_H

namespace zrm {

/// The texts of one entry's time fields, terminated; an empty one was not in the entry.
struct _EntryTimeBuffers {
    static constexpr int room = 7; ///< characters of each

    char year[room + 1];
    char month[room + 1];
    char day[room + 1];
    char hour[room + 1];
    char minute[room + 1];
    char second[room + 1];
};

} // namespace zrm

#endif
