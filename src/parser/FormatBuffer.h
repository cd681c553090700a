#ifndef ZRM_FORMAT_BUFFER_H
#define ZRM_FORMAT_BUFFER_H

#include <cstddef>
#include <cstring>

namespace zrm {

/// Where the texts of one keyword's fields are written, one behind the other, without terminators.
/// The caller sets it up before each line.
struct _FormatBuffer {
    char* position; ///< where the next text goes
    long room;      ///< characters still free there

    /// Writes as much of the text as there is room for.
    void append(const char* text, std::size_t length) noexcept {
        if (room > 0 && length > 0) {
            const std::size_t written =
                length < static_cast<std::size_t>(room) ? length : static_cast<std::size_t>(room);
            std::memcpy(position, text, written);
            advance(written);
        }
    }
    /// Takes over so many characters that were written at the position, within its room.
    void advance(std::size_t length) noexcept {
        position += length;
        room -= static_cast<long>(length);
    }
};

} // namespace zrm

#endif
