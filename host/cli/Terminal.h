#ifndef ZRM_HOST_TERMINAL_H
#define ZRM_HOST_TERMINAL_H

#include <cstddef>
#include <string>
#include <string_view>

namespace zrm::host {

/// Colours by what they mean.
enum class Colour { NONE, GOOD, NOTICE, BAD, FAINT, HEADING };

/// What standard output is able to show.
struct Terminal {
    bool isTerminal = false;
    std::size_t width = 0; ///< columns; 0: no limit
    bool hasColours = false;
    bool isUtf8 = true; ///< otherwise only the marks that zrmctl adds keep to ASCII

    /// Standard output as it is. The width comes from COLUMNS or the terminal; NO_COLOR and
    /// TERM=dumb switch colours off. Outside a terminal lines have any width and no colours.
    static Terminal ofStandardOutput();

    /// The text in a colour, where there are colours.
    std::string coloured(std::string_view text, Colour colour) const;
    /// What stands for the rest of a text that is cut.
    std::string_view ellipsis() const noexcept { return isUtf8 ? "…" : "..."; }
};

} // namespace zrm::host

#endif
