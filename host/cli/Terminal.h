#ifndef ZRM_HOST_TERMINAL_H
#define ZRM_HOST_TERMINAL_H

#include <cstddef>
#include <string>
#include <string_view>

namespace zrm::host {

/// Colours by meaning.
enum class Colour { NONE, GOOD, NOTICE, BAD, FAINT, HEADING };

/// What standard output can show.
struct Terminal {
    bool isTerminal = false;
    std::size_t width = 0; ///< columns; 0: no limit
    bool hasColours = false;
    bool isUtf8 = true; ///< when false, the marks that zrmctl adds (and only those) are ASCII

    /// The current standard output. The width comes from COLUMNS or the terminal; NO_COLOR and
    /// TERM=dumb switch colours off. Without a terminal there is no width limit and no colour.
    static Terminal ofStandardOutput();

    /// The text in a colour, if colours are on.
    std::string coloured(std::string_view text, Colour colour) const;
    /// The mark that replaces the rest of a shortened text.
    std::string_view ellipsis() const noexcept { return isUtf8 ? "…" : "..."; }
};

} // namespace zrm::host

#endif
