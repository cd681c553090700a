#include "host/silences/Wildcard.h"

#include "host/base/Utf8.h"

namespace zrm::host {

bool Wildcard::isStar(std::size_t at) const noexcept {
    return at < m_pattern.size() && m_pattern[at] == '*';
}

Wildcard::Taken Wildcard::take(std::size_t at, std::string_view text) const noexcept {
    if (at >= m_pattern.size() || text.empty()) {
        return {};
    }
    if (m_pattern[at] == '?') {
        const bool isSlash = m_isPath && text.front() == '/';
        return isSlash ? Taken{} : Taken{1, Utf8::firstSequence(text).length};
    }
    const bool isEscaped = m_pattern[at] == '\\' && at + 1 < m_pattern.size();
    const std::size_t literal = at + (isEscaped ? 1 : 0);
    return m_pattern[literal] == text.front() ? Taken{literal + 1 - at, 1} : Taken{};
}

/// Only the last star is ever tried again: whatever an earlier one could take more, the last one
/// can take as well. That holds for paths, too, since each slash is matched by one of the pattern.
bool Wildcard::matches(std::string_view text) const noexcept {
    std::size_t at = 0;                             // in the pattern
    std::size_t begin = 0;                          // in the text
    std::size_t afterStar = std::string_view::npos; // npos: there was no star
    std::size_t taken = 0;                          // the end of what the star has taken
    while (begin < text.size() || at < m_pattern.size()) {
        if (isStar(at)) {
            afterStar = ++at;
            taken = begin;
            continue;
        }
        if (const Taken next = take(at, text.substr(begin)); next.ofPattern > 0) {
            at += next.ofPattern;
            begin += next.ofText;
            continue;
        }
        const bool isStarStuck = afterStar == std::string_view::npos || taken >= text.size() ||
                                 (m_isPath && text[taken] == '/');
        if (isStarStuck) {
            return false;
        }
        taken += Utf8::firstSequence(text.substr(taken)).length;
        begin = taken;
        at = afterStar;
    }
    return true;
}

bool Wildcard::isPattern() const noexcept {
    for (std::size_t at = 0; at < m_pattern.size(); ++at) {
        if (m_pattern[at] == '*' || m_pattern[at] == '?') {
            return true;
        }
        at += m_pattern[at] == '\\' ? 1 : 0;
    }
    return false;
}

} // namespace zrm::host
