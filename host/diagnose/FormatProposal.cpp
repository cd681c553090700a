#include "host/diagnose/FormatProposal.h"

#include "host/formats/TimePattern.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <map>
#include <string_view>
#include <utility>

namespace zrm::host {

namespace {

constexpr std::size_t mostLines = 1000;
constexpr std::size_t mostTimeWords = 6;
constexpr std::size_t longestTime = 40; ///< bytes
constexpr std::size_t mostParts = 10;   ///< of a line in front of its message
constexpr std::size_t mostPatterns = 4;
constexpr std::string_view timeEnds = " \t],|;)";

constexpr std::array<std::string_view, 27> levels = {
    "trace", "debug",   "verbose", "fine",   "info",  "information", "notice",
    "warn",  "warning", "error",   "err",    "crit",  "critical",    "fatal",
    "alert", "emerg",   "panic",   "severe", "audit", "emergency",   "dbg",
    "wrn",   "log",     "success", "config", "note",  "system"};

constexpr bool isLetter(char c) noexcept {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}
constexpr bool isDigit(char c) noexcept {
    return c >= '0' && c <= '9';
}

bool isLevel(std::string_view word) {
    std::string small(word);
    for (char& c : small) {
        c = c >= 'A' && c <= 'Z' ? static_cast<char>(c - 'A' + 'a') : c;
    }
    return std::find(levels.begin(), levels.end(), small) != levels.end();
}

bool isNumber(std::string_view word) {
    return !word.empty() && std::all_of(word.begin(), word.end(), isDigit);
}

/// A name such as com.example.Main, shop.cart or server.go:17.
bool isDottedName(std::string_view word) {
    const bool isName = !word.empty() && isLetter(word.front()) &&
                        std::all_of(word.begin(), word.end(), [](char c) {
                            return isLetter(c) || isDigit(c) || c == '.' || c == '_' || c == '$' ||
                                   c == '-' || c == ':' || c == '/';
                        });
    return isName && word.find_first_of("./:") != std::string_view::npos && word.back() != '.';
}

/// The characters of a pattern that stand for this character.
std::string literal(char c) {
    constexpr std::string_view special = "\\.^$|()[]{}*+?";
    return (special.find(c) == std::string_view::npos ? "" : "\\") + std::string(1, c);
}

/// A pattern for texts that look like this time.
std::string timePattern(std::string_view time) {
    std::string pattern;
    for (std::size_t at = 0; at < time.size();) {
        const char c = time[at];
        const auto same = [c](char other) {
            return isDigit(c) ? isDigit(other) : isLetter(c) ? isLetter(other) : other == c;
        };
        const auto end =
            std::find_if_not(time.begin() + static_cast<std::ptrdiff_t>(at), time.end(), same);
        const auto next = static_cast<std::size_t>(end - time.begin());
        if (isDigit(c)) {
            pattern += R"(\d+)";
        } else if (isLetter(c)) {
            pattern += "[A-Za-z]+";
        } else if (c == ' ') {
            pattern += " +";
        } else {
            for (; at < next; ++at) {
                pattern += literal(c);
            }
        }
        at = next;
    }
    return pattern;
}

/// Takes the beginning of one line apart.
class Shape {
public:
    Shape(std::string_view line, const TimePattern& times) : m_rest(line), m_times(times) {
        while (m_parts < mostParts && takePart()) {
            ++m_parts;
        }
        m_pattern += "(?P<description>.*)";
    }

    /// The pattern; lines of the same shape have the same.
    const std::string& pattern() const noexcept { return m_pattern; }
    /// Whether more than a message was recognised.
    bool isTelling() const noexcept { return m_hasTime || m_hasLevel; }

private:
    bool takePart() {
        if (m_rest.empty()) {
            return false;
        }
        return takeSeparator() || (!m_hasTime && takeTime()) || takeBracket() || takeWord();
    }

    void take(std::size_t length, const std::string& pattern) {
        m_rest.remove_prefix(length);
        m_pattern += pattern;
    }

    /// Blanks and what stands between columns.
    bool takeSeparator() {
        const char c = m_rest.front();
        if (c == ' ' || c == '\t') {
            const std::size_t end = std::min(m_rest.find_first_not_of(" \t"), m_rest.size());
            take(end, R"(\s+)");
            return true;
        }
        const bool isDash = (c == '-' || c == ':') && m_rest.size() > 1 && m_rest[1] == ' ';
        if (m_parts > 0 && (c == '|' || c == ',' || c == ';' || isDash)) {
            take(1, literal(c));
            return true;
        }
        return false;
    }

    bool takeTime() {
        std::size_t best = 0;
        std::size_t end = m_rest.front() == '[' ? 1 : 0;
        const std::size_t begin = end;
        for (std::size_t words = 0; words < mostTimeWords && end < m_rest.size(); ++words) {
            end = std::min(m_rest.find_first_of(timeEnds, end + 1), m_rest.size());
            if (end - begin > longestTime) {
                break;
            }
            EntryColumns columns;
            if (m_times.read(m_rest.substr(begin, end - begin), columns) && columns.hasTime) {
                best = end;
            }
        }
        if (best == 0) {
            return false;
        }
        const std::string_view time = m_rest.substr(begin, best - begin);
        const std::string inner = "(?P<time>" + timePattern(time) + ')';
        const bool isClosed = begin == 1 && best < m_rest.size() && m_rest[best] == ']';
        if (begin == 1 && !isClosed) {
            return false;
        }
        m_hasTime = true;
        take(best + (isClosed ? 1 : 0), isClosed ? R"(\[)" + inner + R"(\])" : inner);
        return true;
    }

    /// A level, a number or a text in brackets.
    bool takeBracket() {
        const char open = m_rest.front();
        const char close = open == '[' ? ']' : open == '(' ? ')' : open == '<' ? '>' : '\0';
        const std::size_t end = close == '\0' ? std::string_view::npos : m_rest.find(close);
        if (end == std::string_view::npos || end > longestTime * 2) {
            return false;
        }
        std::string_view inner = m_rest.substr(1, end - 1);
        inner.remove_suffix(inner.size() - (inner.find_last_not_of(' ') + 1));
        std::string name = "part" + std::to_string(m_fields + 1);
        if (isLevel(inner) && !m_hasLevel) {
            m_hasLevel = true;
            take(end + 1, literal(open) + "(?P<type>[A-Za-z]+) *" + literal(close));
            return true;
        }
        if (isDottedName(inner) && !m_hasSource) {
            m_hasSource = true;
            name = "source";
        } else {
            ++m_fields;
        }
        take(end + 1,
             literal(open) + "(?P<" + name + ">[^" + literal(close) + "]*)" + literal(close));
        return true;
    }

    /// A level, a name of a logger, a number; anything else begins the message.
    bool takeWord() {
        const std::size_t end = std::min(m_rest.find_first_of(" \t|,;"), m_rest.size());
        std::string_view word = m_rest.substr(0, end);
        const bool hasColon = word.size() > 1 && word.back() == ':';
        word.remove_suffix(hasColon ? 1 : 0);
        const std::string colon = hasColon ? ":" : "";
        if (!m_hasLevel && isLevel(word)) {
            m_hasLevel = true;
            take(end, "(?P<type>[A-Za-z]+)" + colon);
            return true;
        }
        if (isNumber(word) && m_hasTime) {
            take(end, "(?P<number" + std::to_string(++m_fields) + R"(>\d+))" + colon);
            return true;
        }
        const bool isName = isDottedName(word) || hasColon;
        if (!m_hasSource && isName && isTelling()) {
            m_hasSource = true;
            take(end,
                 hasColon ? R"((?P<source>[^\s:]+(?::[^\s:]+)*):)" : R"((?P<source>[^\s|,;]+))");
            return true;
        }
        return false;
    }

    std::string_view m_rest;
    const TimePattern& m_times;
    std::string m_pattern = "^";
    std::size_t m_parts = 0;
    std::size_t m_fields = 0;
    bool m_hasTime = false;
    bool m_hasLevel = false;
    bool m_hasSource = false;
};

} // namespace

std::optional<FormatDescription> proposeFormat(const std::vector<std::string>& lines) {
    constexpr std::size_t leastPercent = 5; ///< of the lines that a pattern must be good for
    const auto times = TimePattern::common();
    std::map<std::string, std::size_t> counts;
    const std::size_t count = std::min(lines.size(), mostLines);
    for (std::size_t i = 0; i < count; ++i) {
        const Shape shape(lines[i], *times);
        if (shape.isTelling()) {
            ++counts[shape.pattern()];
        }
    }
    std::vector<std::pair<std::size_t, std::string>> ranked;
    for (const auto& [pattern, number] : counts) {
        if (number * 100 >= count * leastPercent) {
            ranked.emplace_back(number, pattern);
        }
    }
    std::sort(ranked.rbegin(), ranked.rend());
    if (ranked.empty()) {
        return std::nullopt;
    }
    ranked.resize(std::min(ranked.size(), mostPatterns));
    FormatDescription format;
    format.type = "regex";
    for (auto& [number, pattern] : ranked) {
        format.patterns.push_back(std::move(pattern));
    }
    return format;
}

} // namespace zrm::host
