#include "host/cli/MarkedText.h"

#include "host/cli/DisplayText.h"

#include <algorithm>

namespace zrm::host {

namespace {

constexpr std::size_t narrowest = 10; ///< the fewest columns of the text that are shown

} // namespace

std::string MarkedText::of(std::string_view text, std::size_t at, std::size_t indent,
                           const Terminal& terminal) {
    at = std::min(at, text.size());
    std::string before = DisplayText::visible(text.substr(0, at));
    std::string rest = DisplayText::visible(text.substr(at));
    if (terminal.width > 0) {
        const std::size_t room =
            std::max(narrowest, terminal.width > indent ? terminal.width - indent : 0);
        const std::size_t columns = DisplayText::width(before);
        if (columns + std::max<std::size_t>(DisplayText::width(rest), 1) > room &&
            columns > room / 2) {
            const std::size_t mark = DisplayText::width(terminal.ellipsis());
            const std::size_t dropped = columns - room / 2 + mark;
            before.erase(0, DisplayText::beginning(before, dropped).size());
            before.insert(0, terminal.ellipsis());
        }
        rest = DisplayText::shortened(rest, room - std::min(room, DisplayText::width(before)),
                                      terminal.ellipsis());
    }
    const std::string blanks(indent, ' ');
    return blanks + before + rest + '\n' + blanks + std::string(DisplayText::width(before), ' ') +
           terminal.coloured("^", Colour::BAD) + '\n';
}

} // namespace zrm::host
