#ifndef ZRM_HOST_LINE_PATTERN_H
#define ZRM_HOST_LINE_PATTERN_H

#include "host/base/Result.h"
#include "host/formats/PatternProgram.h"

#include <array>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace re2 {
class RE2;
}

namespace zrm::host {

/// A regular expression that is looked for in each line of a log. Not changed after it was made;
/// any thread.
class LinePattern {
public:
    static constexpr std::size_t longest = 4096; ///< bytes of an expression

    /// Refuses what RE2 does not accept, and what needs too much memory. Problem::field is empty.
    static Result<LinePattern> compile(const std::string& pattern);

    LinePattern(LinePattern&&) noexcept;
    LinePattern& operator=(LinePattern&&) noexcept;
    ~LinePattern();

    /// Whether the line has a match anywhere; an expression that begins with "^" has one only at
    /// the beginning.
    bool matches(std::string_view line) const;

private:
    explicit LinePattern(std::unique_ptr<const re2::RE2> expression);

    std::unique_ptr<const re2::RE2> m_expression;
    std::optional<PatternProgram> m_program; ///< of an expression that begins with "^"
    /// For each byte: whether a line that begins with it may match. Most lines are decided by that.
    std::array<bool, 256> m_mayBegin;
};

} // namespace zrm::host

#endif
