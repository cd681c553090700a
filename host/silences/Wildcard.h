#ifndef ZRM_HOST_WILDCARD_H
#define ZRM_HOST_WILDCARD_H

#include <cstddef>
#include <string>
#include <string_view>
#include <utility>

namespace zrm::host {

/// A pattern for whole texts in UTF-8: '*' stands for any characters, '?' for one, and a backslash
/// takes the next character literally. Matching takes no memory, and at most the product of both
/// lengths in steps. Immutable, so any thread.
class Wildcard {
public:
    enum class Kind {
        TEXT,
        PATH, ///< '*' and '?' do not stand for a slash
    };

    explicit Wildcard(std::string pattern, Kind kind = Kind::TEXT)
        : m_pattern(std::move(pattern)), m_isPath(kind == Kind::PATH) {}

    bool matches(std::string_view text) const noexcept;

    const std::string& pattern() const noexcept { return m_pattern; }

    /// Whether the pattern matches more than one text.
    bool isPattern() const noexcept;

private:
    /// Bytes of the pattern and of the text that the element of the pattern at `at` takes.
    struct Taken {
        std::size_t ofPattern = 0; ///< 0: the text does not begin with the element
        std::size_t ofText = 0;
    };
    Taken take(std::size_t at, std::string_view text) const noexcept;
    bool isStar(std::size_t at) const noexcept;

    std::string m_pattern;
    bool m_isPath;
};

} // namespace zrm::host

#endif
