#ifndef ZRM_HOST_ENTRY_PATTERN_H
#define ZRM_HOST_ENTRY_PATTERN_H

#include "host/base/Result.h"
#include "host/formats/PatternProgram.h"

#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace re2 {
class RE2;
}

namespace zrm::host {

/// A regular expression of a format, in RE2's syntax, with named captures. It matches bytes, so
/// that no text is too broken for it. Not changed after it was made; any thread.
class EntryPattern {
public:
    static constexpr std::size_t longest = 4096; ///< bytes of an expression
    static constexpr std::size_t mostCaptures = 64;

    /// A problem has no field. Refuses an expression without named captures.
    static Result<EntryPattern> compile(const std::string& expression);

    EntryPattern(EntryPattern&& other) noexcept;
    EntryPattern& operator=(EntryPattern&& other) noexcept;
    ~EntryPattern();

    /// The captures of a match, in the order of the expression. A capture that takes no part has no
    /// data. Views into the text.
    using Captures = std::vector<std::string_view>;
    /// What a match uses. Allocates nothing once it has been used. One thread.
    struct Workspace {
        std::vector<const char*> places;
    };

    /// Matches the beginning of the text, and maybe no more than that.
    bool match(std::string_view text, Captures& captures, Workspace& workspace) const;

    /// Of each capture; empty for those without a name.
    const std::vector<std::string>& names() const noexcept { return m_names; }

private:
    explicit EntryPattern(std::unique_ptr<re2::RE2> expression);

    bool matchByLibrary(std::string_view text, Captures& captures) const;

    std::unique_ptr<re2::RE2> m_expression;
    std::vector<std::string> m_names;
    std::optional<PatternProgram> m_program;
};

} // namespace zrm::host

#endif
