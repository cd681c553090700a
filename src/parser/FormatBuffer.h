#ifndef ZRM_FORMAT_BUFFER_H
#define ZRM_FORMAT_BUFFER_H

#include <cstddef>
#include <cstring>

namespace zrm {

/// The buffer for the texts of one keyword's fields, written one after the other without
/// terminators. The caller sets it up before each line.
struct _FormatBuffer {
    char* position; ///< where the next text goes
    long room;      ///< characters still free

    /// Writes as much of the text as fits.
    void append(const char* text, std::size_t length) noexcept {
        if (room > 0 && length > 0) {
            const std::size_t written =
                length < static_cast<std::size_t>(room) ? length : static_cast<std::size_t>(room);
            std::memcpy(position, text, written);
            advance(written);
        }
    }
    /// Skips `length` characters already written at the position. They must fit in the room.
    void advance(std::size_t length) noexcept {
        position += length;
        room -= static_cast<long>(length);
    }
};

} // namespace zrm

#endif
