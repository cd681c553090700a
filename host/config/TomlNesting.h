#ifndef ZRM_HOST_TOML_NESTING_H
#define ZRM_HOST_TOML_NESTING_H

#include <optional>
#include <string_view>

namespace zrm::host {

/// How deep a TOML text goes. The parser takes names of any number of parts, and what it makes of
/// them is freed recursively, so a text is looked at before it is parsed. Stateless.
class TomlNesting {
public:
    /// Most parts of a dotted name, and most brackets that are open at once.
    static constexpr int deepest = 32;

    /// The line on which the text goes deeper, counted from 1; none when it does not. A text that
    /// is not TOML may be misread, but only behind the place at which the parser refuses it.
    static std::optional<unsigned> tooDeepAt(std::string_view text);
};

} // namespace zrm::host

#endif
