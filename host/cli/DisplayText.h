#ifndef ZRM_HOST_DISPLAY_TEXT_H
#define ZRM_HOST_DISPLAY_TEXT_H

#include <cstddef>
#include <string>
#include <string_view>

namespace zrm::host {

/// Makes texts from logs safe to show on a terminal. Any thread.
namespace DisplayText {

/// The text with everything that could control a terminal or hide other text escaped (\n, \t, \x1b,
/// \u202e) and invalid UTF-8 replaced by the replacement character.
std::string visible(std::string_view text);

/// The number of terminal columns that a visible text takes.
std::size_t width(std::string_view visible);

/// The longest prefix of a visible text that fits `columns`; characters are not split.
std::string_view beginning(std::string_view visible, std::size_t columns);

/// A visible text shortened to at most `columns`; a longer one ends with the ellipsis.
std::string shortened(std::string_view visible, std::size_t columns, std::string_view ellipsis);

/// The same, but a longer text keeps its end and begins with the ellipsis.
std::string shortenedPath(std::string_view visible, std::size_t columns, std::string_view ellipsis);

} // namespace DisplayText

} // namespace zrm::host

#endif
