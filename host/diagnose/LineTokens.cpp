#include "host/diagnose/LineTokens.h"

#include "host/diagnose/LineWords.h"
#include "host/diagnose/TokenShapes.h"
#include "host/formats/TimePattern.h"

#include <algorithm>
#include <optional>
#include <utility>

namespace zrm::host {

namespace {

constexpr std::size_t mostTokens = 40;
constexpr std::size_t longestHead = 512; ///< bytes of a line that are looked at
constexpr std::size_t longestBracket = 120;
constexpr std::string_view timePrefixes = "*%#~!."; ///< marks that some write in front of times

constexpr bool isLetter(char c) noexcept {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}
constexpr bool isDigit(char c) noexcept {
    return c >= '0' && c <= '9';
}
constexpr bool isBlank(char c) noexcept {
    return c == ' ' || c == '\t';
}
constexpr char closing(char open) noexcept {
    return open == '[' ? ']' : open == '(' ? ')' : open == '<' ? '>' : open == '{' ? '}' : '\0';
}

class Tokens {
public:
    Tokens(std::string_view line, const TimePattern& times)
        : m_rest(line.substr(0, longestHead)), m_times(times), m_delimiter(delimiterOf(m_rest)) {
        skipBlanks();
        while (!m_rest.empty() && m_tokens.size() < mostTokens) {
            takeToken();
            skipBlanks();
        }
    }

    std::vector<LineToken> result() { return std::move(m_tokens); }

private:
    using Kind = LineToken::Kind;

    void skipBlanks() {
        std::size_t count = 0;
        while (count < m_rest.size() && isBlank(m_rest[count]) && m_rest[count] != m_delimiter) {
            ++count;
        }
        m_rest.remove_prefix(count);
        if (!m_tokens.empty()) {
            m_tokens.back().blanks += count;
        }
    }

    void take(Kind kind, std::size_t length, char mark = '\0') {
        m_tokens.push_back({kind, m_rest.substr(0, length), mark, 0, !m_open.empty()});
        m_rest.remove_prefix(length);
    }
    void takeMark() { take(Kind::mark, 1, m_rest.front()); }

    void takeToken() {
        if (isBeforeTime()) {
            takeMark();
            return;
        }
        if (takeGluedLetter() || takeTime() || takeEnclosed() || takeCell() || takeCode()) {
            return;
        }
        takeWord();
    }

    /// "*Mar  1 18:48:50": a mark that touches the time.
    bool isBeforeTime() const {
        return !m_hasTime && timePrefixes.find(m_rest[0]) != std::string_view::npos &&
               timeLength(m_rest.substr(1), m_times) > 0;
    }

    bool takeTime() {
        const std::size_t length = m_hasTime ? 0 : timeLength(m_rest, m_times);
        if (length == 0) {
            return false;
        }
        take(Kind::time, length);
        m_hasTime = true;
        // 2026-11-19 10:00:00;INFO;text: a few columns, of which the first shows what is between.
        constexpr std::string_view delimiters = ",;|";
        const bool isDelimited = m_delimiter == '\0' && m_open.empty() && m_rest.size() > 1 &&
                                 delimiters.find(m_rest[0]) != std::string_view::npos &&
                                 isLetter(m_rest[1]);
        m_delimiter = isDelimited ? m_rest[0] : m_delimiter;
        // 10:00:00:INFO:name: every column ends with a colon.
        m_hasColons = m_rest.size() > 1 && m_rest[0] == ':' && isLetter(m_rest[1]);
        return true;
    }

    /// "I1119 10:00:00": a level that touches the time.
    bool takeGluedLetter() {
        const bool isGlued = m_tokens.empty() && m_rest.size() > 1 && isDigit(m_rest[1]) &&
                             isOneLetter(m_rest.substr(0, 1)) &&
                             timeLength(m_rest.substr(1), m_times) > 0;
        if (isGlued) {
            take(Kind::letter, 1);
        }
        return isGlued;
    }

    bool takeEnclosed() {
        const char first = m_rest.front();
        if (!m_open.empty() && first == m_open.back()) {
            takeMark();
            m_open.pop_back();
            return true;
        }
        if (opensTime() || opensLevel()) {
            m_open += first == '*' || first == '"' ? first : closing(first);
            takeMark();
            return true;
        }
        if (first == '"') {
            return takeQuoted();
        }
        const std::size_t end = closing(first) == '\0' ? 0 : endOfBracket();
        if (end == 0 || (first == '{' && !isPath(m_rest.substr(1, end - 1)) &&
                         !isNameWord(m_rest.substr(1, end - 1)))) {
            return false;
        }
        if (enclosesColumns(m_rest.substr(1, end - 1), m_hasTime ? nullptr : &m_times)) {
            m_open += closing(first);
            takeMark();
            return true;
        }
        m_tokens.push_back(
            {Kind::bracket, trimmed(m_rest.substr(1, end - 1)), first, 0, !m_open.empty()});
        m_rest.remove_prefix(end + 1);
        return true;
    }

    /// Whether a bracket or quote opens a time that ends behind others, as in
    /// "[2026-11-19][10:00:00]".
    bool opensTime() const {
        constexpr std::string_view opening = "[\"";
        return !m_hasTime && opening.find(m_rest.front()) != std::string_view::npos &&
               timeLength(m_rest.substr(1), m_times) > 0;
    }
    /// "*INFO*"
    bool opensLevel() const {
        const std::size_t end = m_rest.front() == '*' ? m_rest.find('*', 1) : 0;
        return end != 0 && end != std::string_view::npos &&
               isClearLevelName(m_rest.substr(1, end - 1));
    }

    bool takeQuoted() {
        const std::size_t end = m_rest.find('"', 1);
        if (end == std::string_view::npos || end > longestBracket) {
            return false;
        }
        if (enclosesColumns(m_rest.substr(1, end - 1), m_hasTime ? nullptr : &m_times)) {
            m_open += '"';
            takeMark();
            return true;
        }
        m_tokens.push_back({Kind::quoted, m_rest.substr(1, end - 1), '"', 0, !m_open.empty()});
        m_rest.remove_prefix(end + 1);
        return true;
    }

    /// The place of the bracket that closes the one at the beginning; 0: none.
    std::size_t endOfBracket() const {
        std::size_t depth = 0;
        const std::size_t most = std::min(m_rest.size(), longestBracket);
        for (std::size_t at = 0; at < most; ++at) {
            depth += m_rest[at] == m_rest.front() ? 1 : 0;
            if (m_rest[at] == closing(m_rest.front()) && --depth == 0) {
                return at;
            }
        }
        return 0;
    }

    /// What is between two delimiters, or before a level within brackets.
    bool takeCell() {
        const char first = m_rest.front();
        if (m_delimiter != '\0' && first == m_delimiter) {
            takeMark();
            return true;
        }
        std::size_t end = std::string_view::npos;
        if (m_delimiter != '\0' && m_open.empty()) {
            end = m_rest.find(m_delimiter);
        } else if (!m_open.empty()) {
            const std::size_t close = std::min(m_rest.find(m_open.back()), m_rest.size());
            const std::size_t slash = m_rest.substr(0, close).rfind('/');
            end = slash != std::string_view::npos && slash > 0 &&
                          isLevelName(trimmed(m_rest.substr(slash + 1, close - slash - 1)))
                      ? slash
                      : end;
        }
        if (end == std::string_view::npos || end == 0) {
            return false;
        }
        const std::string_view text = trimmed(m_rest.substr(0, end));
        if (text.find(' ') == std::string_view::npos && m_open.empty()) {
            return false; // a word
        }
        take(Kind::cell, text.size());
        return true;
    }

    std::size_t wordLength() const {
        std::string ends = " \t";
        if (m_delimiter != '\0') {
            ends += m_delimiter;
        }
        ends += m_hasColons || !m_open.empty() ? ":" : "";
        ends += m_open.empty() ? "" : ",";
        if (!m_open.empty()) {
            ends += m_open.back();
        }
        const std::size_t end = std::min(m_rest.find_first_of(ends), m_rest.size());
        return end + placeLength(m_rest.substr(0, end), m_rest.substr(end));
    }
    /// The length of ":17" behind the name of a source file within brackets.
    std::size_t placeLength(std::string_view word, std::string_view rest) const {
        if (m_open.empty() || word.find('.') == std::string_view::npos || !rest.starts_with(':')) {
            return 0;
        }
        const std::size_t end = std::min(rest.find_first_not_of("0123456789", 1), rest.size());
        const bool isEnd = end < rest.size() && (isBlank(rest[end]) || rest[end] == m_open.back());
        return end > 1 && isEnd ? end : 0;
    }

    bool takeCode() {
        const std::optional<MessageCode> code = messageCode(m_rest);
        if (!code) {
            return false;
        }
        for (std::size_t marks = 0; marks < code->marks; ++marks) {
            takeMark();
        }
        if (code->number > 0) {
            take(Kind::number, code->number);
        }
        take(Kind::path, code->source);
        takeMark();
        take(Kind::severity, 1);
        takeMark();
        take(Kind::cell, code->name);
        return true;
    }

    void takeWord() {
        std::size_t length = wordLength();
        if (length == 0) {
            takeMark();
            return;
        }
        if (takePair()) {
            return;
        }
        // ERROR[11-19, information/Listener and shop.INFO
        const std::size_t end = m_rest.substr(0, length).find_first_of("[/(:");
        if (end != std::string_view::npos && end > 0 && end + 1 < length &&
            isLevelName(m_rest.substr(0, end))) {
            length = end;
        }
        std::string_view word = m_rest.substr(0, length);
        if (takeTag(word)) {
            return;
        }
        constexpr std::string_view single = "-|,;/]>:.!)=*~\"";
        const bool isBehindLevel = word[0] == '/' && !m_tokens.empty() &&
                                   m_tokens.back().kind == Kind::level &&
                                   m_tokens.back().blanks == 0;
        const bool isTightColon = word[0] == ':' && !m_tokens.empty() &&
                                  m_tokens.back().blanks == 0 && m_tokens.back().kind != Kind::mark;
        if (isBehindLevel || isTightColon || isArrow(word) ||
            (word.size() == 1 && single.find(word[0]) != std::string_view::npos)) {
            takeMark();
            return;
        }
        if (constexpr std::string_view behind = ":,;]";
            behind.find(word.back()) != std::string_view::npos) {
            const bool isClosed = word.back() == ']' && word.find('[') != std::string_view::npos;
            length -= isClosed ? 0 : 1;
        } else if (word.back() == '!' && isOneLetter(word.substr(0, 1)) && word.size() == 2) {
            length = 1;
        }
        word = m_rest.substr(0, length);
        if (word.empty()) {
            takeMark();
            return;
        }
        const std::size_t dot = word.rfind('.');
        if (dot != std::string_view::npos && dot > 0 && isLevelName(word.substr(dot + 1)) &&
            isLetter(word[0]) && !hasLevel()) {
            take(Kind::cell, dot);
            takeMark();
            take(Kind::level, word.size() - dot - 1);
            return;
        }
        const bool hasColon = length < m_rest.size() && m_rest[length] == ':';
        take(kindOf(word, hasColon), length);
    }

    /// "D/nsHttp" and "W/Binder(": a level of one letter, and who speaks.
    bool takeTag(std::string_view word) {
        if (word.size() < 4 || word[1] != '/' || !isOneLetter(word.substr(0, 1)) ||
            !isLetter(word[2])) {
            return false;
        }
        take(Kind::letter, 1);
        takeMark();
        take(Kind::path, std::min(word.substr(2).find_first_of("(:"), word.size() - 2));
        return true;
    }

    /// key=value and key="a value".
    bool takePair() {
        std::size_t at = 0;
        while (at < m_rest.size() &&
               (isLetter(m_rest[at]) || isDigit(m_rest[at]) || m_rest[at] == '_' ||
                m_rest[at] == '.' || m_rest[at] == '-')) {
            ++at;
        }
        if (at == 0 || at > 40 || !isLetter(m_rest[0]) || m_rest.substr(at, 1) != "=") {
            return false;
        }
        std::size_t end = std::min(m_rest.find_first_of(" \t,;", at), m_rest.size());
        if (m_rest.substr(at + 1, 1) == "\"") {
            const std::size_t quote = m_rest.find('"', at + 2);
            end = quote == std::string_view::npos ? end : quote + 1;
        }
        take(Kind::pair, end);
        return true;
    }

    bool hasLevel() const {
        return std::ranges::find(m_tokens, Kind::level, &LineToken::kind) != m_tokens.end();
    }

    /// "->", "--", "***" and the like.
    static bool isArrow(std::string_view word) {
        return word.size() > 1 && word.find_first_not_of("-=>*~:") == std::string_view::npos;
    }

    static Kind kindOf(std::string_view word, bool hasColon) {
        if (isLevelName(word)) {
            return Kind::level;
        }
        if (isOneLetter(word)) {
            return Kind::letter;
        }
        if (isNumber(word)) {
            return Kind::number;
        }
        if (hasColon && (isLetter(word[0]) || word[0] == '_' || word[0] == '/')) {
            return Kind::name;
        }
        return isPath(word) ? Kind::path : Kind::word;
    }

    std::string_view m_rest;
    const TimePattern& m_times;
    char m_delimiter;
    std::vector<LineToken> m_tokens;
    std::string m_open; ///< the characters that close what was opened
    bool m_hasTime = false;
    bool m_hasColons = false;
};

} // namespace

std::string LineToken::symbol() const {
    switch (kind) {
    case Kind::mark:
        return std::string("m") + mark;
    case Kind::bracket:
        return std::string("b") + mark;
    case Kind::time:
        return 't' + timeExpression(text);
    case Kind::pair:
        return 'k' + std::string(text.substr(0, text.find('=')));
    default:
        return std::string(1, static_cast<char>('A' + static_cast<int>(kind)));
    }
}

std::vector<LineToken> lineTokens(std::string_view line, const TimePattern& times) {
    return Tokens(line, times).result();
}

} // namespace zrm::host
