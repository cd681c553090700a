#ifndef ZRM_HOST_UTF8_H
#define ZRM_HOST_UTF8_H

#include <cstddef>
#include <string_view>

namespace zrm::host {

/// Examination of text that should be UTF-8. Any thread; neither locks nor allocates.
namespace Utf8 {

/// What the replacement character looks like in UTF-8.
inline constexpr std::string_view replacement = "\xEF\xBF\xBD";

/// Whether all of the text is ASCII. Looks at every byte, so it is for short texts that mostly are.
bool isAscii(std::string_view text) noexcept;

/// Length of the leading part that is ASCII.
std::size_t asciiPrefix(std::string_view text) noexcept;

/// Length of the leading part that is valid.
std::size_t validPrefix(std::string_view text) noexcept;

/// One character, or one piece that is none.
struct Sequence {
    std::size_t length; ///< bytes; of an invalid piece, those that one replacement stands for
    bool valid;
};

/// The sequence at the beginning of a text that is not empty. An invalid piece is the longest
/// beginning of a character that was broken off, or one byte.
Sequence firstSequence(std::string_view text) noexcept;

/// The character of a valid sequence.
char32_t character(std::string_view sequence) noexcept;

/// Whether a character steers how text is shown instead of showing something: the controls of
/// terminals (C0, delete, C1), separators of lines, and what changes the direction of text.
bool isSteering(char32_t character) noexcept;

/// The longest beginning of at most `size` bytes that does not cut a character.
std::string_view prefix(std::string_view text, std::size_t size) noexcept;

} // namespace Utf8

} // namespace zrm::host

#endif
