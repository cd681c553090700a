#ifndef ZRM_HOST_LINE_WORDS_H
#define ZRM_HOST_LINE_WORDS_H

#include <string>
#include <string_view>

namespace zrm::host {

/// Whether a word is the usual name of a level, in any case.
bool isLevelName(std::string_view word) noexcept;
/// One that may stand in brackets, where "config" and "message" are names.
bool isBracketLevel(std::string_view word) noexcept;
/// The same, of a name that is hardly ever a word of a message.
bool isClearLevelName(std::string_view word) noexcept;

/// Whether a text is one or more digits.
bool isNumber(std::string_view word) noexcept;
/// A name such as com.example.Main, shop::cart, server.go:17, queue/reader or cron[17].
bool isPath(std::string_view word) noexcept;
/// The name of a file with source code, as in "server.go:17".
bool isPlace(std::string_view text) noexcept;
/// Whether a text looks like the name of a thread, a number or an address rather than like who
/// speaks.
bool isThread(std::string_view text) noexcept;
/// Seconds or milliseconds since 1970, such as "1795078800" or "1795078800.123": other numbers are
/// not times.
bool isEpoch(std::string_view text) noexcept;

/// What stands between most columns of a line: tabs, bars and the like. NUL: blanks.
char delimiterOf(std::string_view line) noexcept;

/// The regular expression for texts that look like this time.
std::string timeExpression(std::string_view time);
/// The regular expression for one character.
std::string literalExpression(char character);

} // namespace zrm::host

#endif
