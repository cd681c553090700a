#include "host/diagnose/TokenShapes.h"

#include "host/diagnose/LineWords.h"
#include "host/formats/TimePattern.h"

#include <algorithm>

namespace zrm::host {

namespace {

constexpr std::size_t longestTime = 40;
constexpr std::size_t mostTimeEnds = 14;
constexpr std::string_view letters = "DINWEFCTV"; ///< that stand for levels
constexpr std::string_view digits = "0123456789";

constexpr bool isDigit(char c) noexcept {
    return c >= '0' && c <= '9';
}
constexpr bool isUpper(char c) noexcept {
    return c >= 'A' && c <= 'Z';
}
constexpr bool isLetter(char c) noexcept {
    return isUpper(c) || (c >= 'a' && c <= 'z');
}

bool isTime(std::string_view text, const TimePattern& times) {
    constexpr std::size_t stamp = 14; // YYYYMMDDhhmmss
    const std::size_t count = std::min(text.find_first_not_of(digits), text.size());
    if (text.find_first_not_of("0123456789.") == std::string_view::npos && !isEpoch(text) &&
        count != stamp) {
        return false;
    }
    const std::size_t bracket = text.find('[');
    const bool isRemark = bracket == std::string_view::npos || text[bracket - 1] != ' ';
    EntryColumns columns;
    return isRemark && text.back() != ' ' && times.read(text, columns) &&
           (columns.hasTime || std::count(text.begin(), text.end(), ':') == 2);
}

/// A level between colons, as in "main:INFO:src/main.rs".
bool hasLevelWithin(std::string_view inner) {
    for (std::size_t at = inner.find(':'); at != std::string_view::npos;) {
        const std::size_t end = inner.find(':', at + 1);
        if (end != std::string_view::npos && isClearLevelName(inner.substr(at + 1, end - at - 1))) {
            return true;
        }
        at = end;
    }
    return false;
}

/// A time behind one of the first commas or colons.
bool hasTimeWithin(std::string_view inner, const TimePattern& times) {
    std::size_t at = 0;
    for (int parts = 0; parts < 3; ++parts) {
        at = inner.find_first_of(",:", at);
        if (at == std::string_view::npos) {
            return false;
        }
        if (timeLength(inner.substr(++at), times) > 0) {
            return true;
        }
    }
    return false;
}

bool isCodeWord(std::string_view word) {
    return !word.empty() && isUpper(word.front()) && std::ranges::all_of(word, [](char c) {
        return isUpper(c) || isDigit(c) || c == '_' || c == '-';
    });
}

} // namespace

std::size_t timeLength(std::string_view text, const TimePattern& times) {
    if (text.empty() ||
        (!isDigit(text.front()) && !isLetter(text.front()) && text.front() != '@')) {
        return 0;
    }
    std::size_t best = 0;
    std::size_t end = 0;
    for (std::size_t ends = 0; ends < mostTimeEnds && end < text.size(); ++ends) {
        end = std::min(text.find_first_of(" \t],|;)>:-\"", end + 1), text.size());
        if (end > longestTime) {
            break;
        }
        if (isTime(text.substr(0, end), times)) {
            best = end;
        }
    }
    return best;
}

bool enclosesColumns(std::string_view inner, const TimePattern* times) {
    inner = trimmed(inner);
    if (isOneLetter(inner) || (times != nullptr && timeLength(inner, *times) > 0)) {
        return true;
    }
    constexpr std::string_view ends = " /:,";
    const std::size_t first = std::min(inner.find_first_of(ends), inner.size());
    const std::size_t last = inner.find_last_of(ends);
    const std::string_view start = inner.substr(0, first);
    const bool isLast = last != std::string_view::npos && inner[last] != ' ' &&
                        isBracketLevel(inner.substr(last + 1));
    const bool isFirst = isBracketLevel(start) && (first == inner.size() || inner[first] != ' ' ||
                                                   inner.substr(first).starts_with(" - "));
    if (isFirst || isLast || hasLevelWithin(inner)) {
        return true;
    }
    const bool isBehindLevel =
        first + 1 < inner.size() && (isOneLetter(start) || isBracketLevel(start));
    return times != nullptr &&
           ((isBehindLevel && timeLength(inner.substr(first + 1), *times) > 0) ||
            hasTimeWithin(inner, *times));
}

bool isOneLetter(std::string_view text) {
    return text.size() == 1 && letters.find(text[0]) != std::string_view::npos;
}

std::string_view trimmed(std::string_view text) {
    constexpr std::string_view blanks = " \t";
    text.remove_prefix(std::min(text.find_first_not_of(blanks), text.size()));
    return text.substr(0, text.find_last_not_of(blanks) + 1);
}

bool isNameWord(std::string_view text) {
    return !text.empty() && isLetter(text.front()) &&
           std::ranges::all_of(text, [](char c) { return isLetter(c) || isDigit(c) || c == '_'; });
}

std::optional<MessageCode> messageCode(std::string_view text) {
    MessageCode code;
    code.marks = std::min(text.find_first_not_of('%'), text.size());
    text.remove_prefix(code.marks);
    if (code.marks == 2) {
        code.number = std::min(text.find_first_not_of(digits), text.size());
        text.remove_prefix(code.number);
    }
    const std::string_view word = text.substr(0, text.find_first_of(" :([\t"));
    if (code.marks == 0 && text.find(": ") == std::string_view::npos) {
        return std::nullopt;
    }
    for (std::size_t at = 1; at + 3 < word.size(); ++at) {
        const char mark = word[at];
        const bool isSeverity = (mark == '-' || mark == '/') && word[at + 1] >= '0' &&
                                word[at + 1] <= '7' && word[at + 2] == mark;
        if (isSeverity && isCodeWord(word.substr(0, at)) && isCodeWord(word.substr(at + 3))) {
            code.source = at;
            code.name = word.size() - at - 3;
            return code;
        }
    }
    return std::nullopt;
}

} // namespace zrm::host
