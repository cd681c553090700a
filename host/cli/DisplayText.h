#ifndef ZRM_HOST_DISPLAY_TEXT_H
#define ZRM_HOST_DISPLAY_TEXT_H

#include <cstddef>
#include <string>
#include <string_view>

namespace zrm::host {

/// Texts of logs made fit for a terminal. Any thread.
namespace DisplayText {

/// The text with everything that could steer a terminal or hide other text written as an escape
/// (\n, \t, \x1b, \u202e), and with the replacement character for what is no UTF-8.
std::string visible(std::string_view text);

/// The columns that a visible text takes on a terminal.
std::size_t width(std::string_view visible);

/// The beginning of a visible text that takes at most so many columns; no character is cut.
std::string_view beginning(std::string_view visible, std::size_t columns);

/// A visible text in at most so many columns; one that is longer ends with the ellipsis.
std::string shortened(std::string_view visible, std::size_t columns, std::string_view ellipsis);

/// The same, but a text that is longer begins with the ellipsis and keeps its end.
std::string shortenedPath(std::string_view visible, std::size_t columns, std::string_view ellipsis);

} // namespace DisplayText

} // namespace zrm::host

#endif
