#include "host/diagnose/LineWords.h"

#include <algorithm>
#include <array>
#include <cstddef>
#include <span>
#include <utility>

namespace zrm::host {

namespace {

/// That hardly stand for anything else.
constexpr std::string_view clearLevels[] = {
    "trace",    "debug", "verbose",  "info",  "notice", "warn",   "warning",     "error",  "err",
    "crit",     "fatal", "critical", "alert", "emerg",  "severe", "emergency",   "panic",  "dbg",
    "wrn",      "inf",   "ftl",      "vrb",   "audit",  "ddebug", "information", "finest", "finer",
    "subdebug", "erro",  "debu",     "fata",  "pani",   "warni",  "noti",        "critic"};
constexpr std::string_view bracketLevels[] = {"fine", "inform",  "note",    "log",
                                              "fail", "success", "failure", "lifecycle"};
constexpr std::string_view otherLevels[] = {"config", "default", "display", "message"};

constexpr bool isLetter(char c) noexcept {
    return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z');
}
constexpr bool isDigit(char c) noexcept {
    return c >= '0' && c <= '9';
}

bool isOneOf(std::span<const std::string_view> names, std::string_view word) noexcept {
    return std::ranges::any_of(names, [word](std::string_view name) {
        return std::ranges::equal(word, name, [](char one, char other) {
            return (one >= 'A' && one <= 'Z' ? one - 'A' + 'a' : one) == other;
        });
    });
}

bool isPathCharacter(char c) noexcept {
    constexpr std::string_view others = "._$-:/#@<>[]()*";
    return isLetter(c) || isDigit(c) || others.find(c) != std::string_view::npos;
}

} // namespace

bool isNumber(std::string_view word) noexcept {
    return !word.empty() && std::all_of(word.begin(), word.end(), isDigit);
}

bool isPath(std::string_view word) noexcept {
    const std::size_t start = std::min(word.find_first_not_of(".#_<"), word.size());
    const bool isName = start < word.size() && isLetter(word[start]) && word.back() != '.' &&
                        std::all_of(word.begin(), word.end(), isPathCharacter);
    return isName && word.find("//") == std::string_view::npos &&
           word.find_first_of("./:[#") != std::string_view::npos;
}

bool isPlace(std::string_view text) noexcept {
    const std::size_t colon = text.find(':');
    const bool hasLine = colon != std::string_view::npos && colon + 1 < text.size() &&
                         text[colon + 1] >= '0' && text[colon + 1] <= '9';
    const std::string_view file = text.substr(0, colon);
    const std::size_t dot = file.rfind('.');
    constexpr std::array<std::string_view, 14> endings = {
        "c", "cc", "cpp", "cxx", "h", "hpp", "go", "py", "rs", "js", "java", "ts", "rb", "php"};
    return dot != std::string_view::npos && (hasLine || file.find('/') != std::string_view::npos) &&
           std::ranges::find(endings, file.substr(dot + 1)) != endings.end();
}

bool isThread(std::string_view text) noexcept {
    constexpr std::array<std::string_view, 15> words = {
        "hread", "exec",      "worker",   "pool", "qtp",   "andler",      "Timer", "pid:",
        "shard", "ispatcher", "Executor", "myid", "-nio-", "scheduling-", "tid:"};
    const bool hasDigit = text.find_first_of("0123456789") != std::string_view::npos;
    const bool isNumber = hasDigit && std::all_of(text.begin(), text.end(), [](char c) {
                              return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f') || c == 'x' ||
                                     c == '-' || c == '.' || c == ':' || c == '/';
                          });
    const bool isNumbered = hasDigit && text.front() >= '0' && text.front() <= '9' &&
                            text.find_first_of("/:") != std::string_view::npos;
    return isNumber || isNumbered || text == "main" ||
           std::ranges::any_of(words, [text](std::string_view word) {
               return text.find(word) != std::string_view::npos;
           });
}

bool isEpoch(std::string_view text) noexcept {
    const std::size_t digits = std::min(text.find_first_not_of("0123456789"), text.size());
    return (digits == 10 || digits == 13) && text.front() == '1' &&
           (digits == text.size() || (text[digits] == '.' && isNumber(text.substr(digits + 1))));
}

char delimiterOf(std::string_view line) noexcept {
    constexpr std::pair<char, std::ptrdiff_t> few[] = {{'\t', 2}, {'|', 2}, {';', 3}, {',', 5}};
    for (const auto& [delimiter, least] : few) {
        if (std::count(line.begin(), line.end(), delimiter) >= least) {
            return delimiter;
        }
    }
    return '\0';
}

bool isLevelName(std::string_view word) noexcept {
    return isBracketLevel(word) || isOneOf(otherLevels, word);
}

bool isBracketLevel(std::string_view word) noexcept {
    return isClearLevelName(word) || isOneOf(bracketLevels, word);
}

bool isClearLevelName(std::string_view word) noexcept {
    return isOneOf(clearLevels, word);
}

std::string literalExpression(char character) {
    constexpr std::string_view special = "\\.^$|()[]{}*+?";
    if (character == '\t') {
        return "\\t";
    }
    return (special.find(character) == std::string_view::npos ? "" : "\\") +
           std::string(1, character);
}

std::string timeExpression(std::string_view time) {
    std::string expression;
    for (std::size_t at = 0; at < time.size();) {
        const char c = time[at];
        const auto same = [c](char other) {
            return isDigit(c) ? isDigit(other) : isLetter(c) ? isLetter(other) : other == c;
        };
        const auto end =
            std::find_if_not(time.begin() + static_cast<std::ptrdiff_t>(at), time.end(), same);
        const auto next = static_cast<std::size_t>(end - time.begin());
        if (isDigit(c)) {
            expression += R"(\d+)";
        } else if (isLetter(c)) {
            expression += "[A-Za-z]+";
        } else if (c == ' ') {
            expression += " +";
        } else {
            for (; at < next; ++at) {
                expression += literalExpression(c);
            }
        }
        at = next;
    }
    return expression;
}

} // namespace zrm::host
