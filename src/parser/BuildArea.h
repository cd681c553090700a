#ifndef ZRM_BUILD_AREA_H
#define ZRM_BUILD_AREA_H

#include <cstddef>
#include <cstring>

namespace zrm {

/// Where a directive is assembled while it is learned: the position in the format text and the
/// directive built so far. One thread, one directive.
struct _BuildArea {
    static constexpr std::size_t limit = 255; ///< characters of a directive, without the terminator

    explicit _BuildArea(const char* start) noexcept : position(start) {}

    /// Appends one character. Returns false if the area is full.
    bool append(char character) noexcept { return append(&character, 1); }
    /// Appends all of the characters, or none and returns false.
    bool append(const char* text, std::size_t length) noexcept {
        return insert(count, text, length);
    }
    /// Inserts all characters before the one at `index`, or none and returns false.
    bool insert(std::size_t index, const char* text, std::size_t length) noexcept {
        if (count + length > limit) {
            return false;
        }
        std::memmove(buffer + index + length, buffer + index, count - index);
        std::memcpy(buffer + index, text, length);
        count += length;
        buffer[count] = '\0';
        return true;
    }
    /// Removes the last character.
    void removeLast() noexcept { buffer[--count] = '\0'; }
    /// The number of characters, for "%.*s" in messages.
    int length() const noexcept { return static_cast<int>(count); }

    const char* position; ///< in the format text
    char buffer[limit + 1] = "";
    std::size_t count = 0; ///< characters in the buffer
};

} // namespace zrm

#endif
