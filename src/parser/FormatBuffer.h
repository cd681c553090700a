#ifndef ZRM_FORMAT_BUFFER_H
#define ZRM_FORMAT_BUFFER_H

#include <cstddef>
#include <cstring>

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
            position += written;
            room -= static_cast<long>(written);
        }
    }
};

#endif
