#ifndef ZRM_HOST_KEY_VALUE_PAIRS_H
#define ZRM_HOST_KEY_VALUE_PAIRS_H

#include "base/EntryFields.h"

#include <string>
#include <string_view>

namespace zrm::host {

/// Finds the pairs of a text such as `level=info msg="ready to serve" port=8080`, one after the
/// other. What is not a pair is passed over. A pair within single quotes is one, too: the audit
/// daemon writes `msg='op=login acct="root"'`. Allocates nothing.
class KeyValuePairs {
public:
    struct Pair {
        std::string_view key;
        std::string_view value; ///< without quotes; a view into the text
        bool isQuoted = false;  ///< in double quotes: the value may have escapes
    };

    explicit KeyValuePairs(std::string_view text) noexcept : m_rest(text) {}

    /// False if there are no more.
    bool next(Pair& pair) noexcept;

    /// Adds a pair, or all pairs of a text. The views are into the text or into memory of `fields`.
    static void addTo(EntryFields& fields, const Pair& pair) noexcept;
    static void addTo(EntryFields& fields, std::string_view text) noexcept;
    /// Whether a text begins with a pair.
    static bool begin(std::string_view text) noexcept;
    /// Appends a value, with its escapes resolved, to anything that has append(std::string_view).
    template <class Text> static void unescape(std::string_view value, Text& text) {
        for (;;) {
            const std::size_t at = value.find('\\');
            text.append(value.substr(0, at));
            if (at == std::string_view::npos || at + 1 == value.size()) {
                return;
            }
            text.append(escaped(value, at + 1));
            value.remove_prefix(at + 2);
        }
    }

private:
    /// What the escape with this character stands for.
    static std::string_view escaped(std::string_view value, std::size_t at) noexcept;
    static std::size_t keyLength(std::string_view text) noexcept;
    void takeValue(Pair& pair) noexcept;

    std::string_view m_rest;
};

} // namespace zrm::host

#endif
