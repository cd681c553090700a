#ifndef ZRM_HOST_LINE_TOKENS_H
#define ZRM_HOST_LINE_TOKENS_H

#include <cstddef>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

class TimePattern;

/// A piece of the beginning of a line, as somebody sees it who looks for columns. Blanks between
/// tokens are not tokens.
struct LineToken {
    enum class Kind {
        mark,     ///< one character that separates or encloses
        time,     ///< a time with or without a date
        level,    ///< a word such as WARN
        letter,   ///< a level of one letter
        severity, ///< a level from 0 to 7, as in "%LINK-3-UPDOWN:"
        number,   ///< digits
        name,     ///< a word before a colon
        path,     ///< a word such as com.example.Main, shop::cart or server.go:17
        pair,     ///< key=value
        quoted,   ///< a text between double quotes, without them
        bracket,  ///< a text between brackets, without them
        cell,     ///< a text between two bars, tabs or the like
        word,     ///< any other word
    };

    Kind kind = Kind::word;
    std::string_view text;  ///< a view into the line
    char mark = '\0';       ///< of a mark; of a bracket the opening one
    std::size_t blanks = 0; ///< behind it
    bool isInside = false;  ///< between brackets with several columns

    /// What tokens of different lines that belong to one column have in common.
    std::string symbol() const;
};

/// The first tokens of a line, a bounded number from a bounded part of it.
std::vector<LineToken> lineTokens(std::string_view line, const TimePattern& times);

} // namespace zrm::host

#endif
