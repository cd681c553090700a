#include "host/config/TomlNesting.h"

#include <algorithm>

namespace zrm::host {

namespace {

/// Scans a text, from one bracket, dot or line end to the next.
class Walker {
public:
    explicit Walker(std::string_view text) : m_text(text) {}

    std::optional<unsigned> tooDeepAt() {
        while (m_at < m_text.size()) {
            take(m_text[m_at]);
            if (m_open > TomlNesting::deepest || m_parts > TomlNesting::deepest) {
                return m_line;
            }
        }
        return std::nullopt;
    }

private:
    void take(char c) {
        switch (c) {
        case '#':
            m_at = std::min(m_text.find('\n', m_at), m_text.size());
            return;
        case '"':
        case '\'':
            skipString(c);
            return;
        case '.':
            ++m_parts;
            break;
        case '[':
        case '{':
            ++m_open;
            m_parts = 1;
            break;
        case ']':
        case '}':
            m_open = std::max(m_open - 1, 0);
            m_parts = 1;
            break;
        case '\n':
            ++m_line;
            m_parts = 1;
            break;
        case ',':
        case '=':
            m_parts = 1;
            break;
        default:
            break;
        }
        ++m_at;
    }

    void skipString(char quote) {
        const std::string_view three = quote == '"' ? R"(""")" : "'''";
        if (m_text.substr(m_at).starts_with(three)) {
            skipLongString(quote, three);
            return;
        }
        ++m_at;
        // A string not closed on its line is an error there.
        while (m_at < m_text.size() && m_text[m_at] != quote && m_text[m_at] != '\n') {
            m_at += quote == '"' && m_text[m_at] == '\\' ? 2 : 1;
        }
        if (m_at < m_text.size() && m_text[m_at] == quote) {
            ++m_at;
        }
    }

    void skipLongString(char quote, std::string_view three) {
        m_at += three.size();
        while (m_at < m_text.size() && !m_text.substr(m_at).starts_with(three)) {
            if (quote == '"' && m_text[m_at] == '\\') {
                ++m_at;
            }
            if (m_at < m_text.size() && m_text[m_at] == '\n') {
                ++m_line;
            }
            ++m_at;
        }
        m_at += three.size();
        // Up to two quotes before the closing three belong to the string.
        for (int more = 0; more < 2 && m_at < m_text.size() && m_text[m_at] == quote; ++more) {
            ++m_at;
        }
    }

    const std::string_view m_text;
    std::size_t m_at = 0;
    unsigned m_line = 1;
    int m_parts = 1; ///< of the current name or value
    int m_open = 0;  ///< open brackets
};

} // namespace

std::optional<unsigned> TomlNesting::tooDeepAt(std::string_view text) {
    return Walker(text).tooDeepAt();
}

} // namespace zrm::host
