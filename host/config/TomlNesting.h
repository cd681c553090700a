#ifndef ZRM_HOST_TOML_NESTING_H
#define ZRM_HOST_TOML_NESTING_H

#include <optional>
#include <string_view>

namespace zrm::host {

/// Limits the nesting of a TOML text. The parser accepts names with any number of parts and frees
/// the result recursively, so a text is checked before it is parsed. Stateless.
class TomlNesting {
public:
    /// The most parts of a dotted name, and the most brackets open at once.
    static constexpr int deepest = 32;

    /// The line, counted from 1, where the nesting exceeds the limit; none when it does not. A text
    /// that is not TOML may be misread, but only after the point where the parser rejects it.
    static std::optional<unsigned> tooDeepAt(std::string_view text);
};

} // namespace zrm::host

#endif
