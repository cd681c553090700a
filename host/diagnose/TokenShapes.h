#ifndef ZRM_HOST_TOKEN_SHAPES_H
#define ZRM_HOST_TOKEN_SHAPES_H

#include <cstddef>
#include <optional>
#include <string_view>

namespace zrm::host {

class TimePattern;

/// The length of a time at the beginning of a text; 0: there is none.
std::size_t timeLength(std::string_view text, const TimePattern& times);

/// Whether what is in a bracket is a time or a level, alone or with others. `times` is null if the
/// line's time has been found.
bool enclosesColumns(std::string_view inner, const TimePattern* times);

/// Whether a text is a letter that stands for a level.
bool isOneLetter(std::string_view text);
/// The text without the blanks around it.
std::string_view trimmed(std::string_view text);
/// Whether a text is letters, digits and underscores, the first a letter.
bool isNameWord(std::string_view text);

/// The lengths of the parts of "%LINK-3-UPDOWN:" and "%%01IFNET/4/LINK_STATE(l)[17]:".
struct MessageCode {
    std::size_t marks = 0;  ///< percent signs
    std::size_t number = 0; ///< digits behind them
    std::size_t source = 0;
    std::size_t name = 0; ///< of the message, behind the digit of the severity
};

/// The code at the beginning of a text, if there is one.
std::optional<MessageCode> messageCode(std::string_view text);

} // namespace zrm::host

#endif
