#ifndef ZRM_HOST_UTF8_H
#define ZRM_HOST_UTF8_H

#include <cstddef>
#include <string_view>

namespace zrm::host {

/// Examination of text that should be UTF-8. Any thread; neither locks nor allocates.
namespace Utf8 {

/// The replacement character in UTF-8.
inline constexpr std::string_view replacement = "\xEF\xBF\xBD";

/// Length of the leading part that is ASCII.
std::size_t asciiPrefix(std::string_view text) noexcept;

/// Length of the leading part that is valid.
std::size_t validPrefix(std::string_view text) noexcept;

/// One character, or one invalid piece.
struct Sequence {
    std::size_t
        length; ///< bytes; of an invalid piece, those that one replacement character replaces
    bool valid;
};

/// The sequence at the beginning of a non-empty text. An invalid piece is the longest incomplete
/// beginning of a character, or one byte.
Sequence firstSequence(std::string_view text) noexcept;

/// The character of a valid sequence.
char32_t character(std::string_view sequence) noexcept;

/// Whether a character controls how text is shown instead of being shown: terminal controls (C0,
/// delete, C1), line separators, and characters that change the direction of text.
bool isSteering(char32_t character) noexcept;

/// The longest prefix of at most `size` bytes that does not split a character.
std::string_view prefix(std::string_view text, std::size_t size) noexcept;

} // namespace Utf8

} // namespace zrm::host

#endif
