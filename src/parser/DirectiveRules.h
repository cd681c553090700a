#ifndef ZRM_DIRECTIVE_RULES_H
#define ZRM_DIRECTIVE_RULES_H

#include "parser/DataType.h"

#include <string_view>

namespace zrm {

// The common rules of scan directives and print directives.

/// A size modifier and the base of its data types.
struct SizeModifier {
    std::string_view text;
    _DataType base;
};

/// Longest first, so that the first match is the right one. The last one always matches.
inline constexpr SizeModifier sizeModifiers[] = {
    {"ll", DATATYPE_BASE_LONGLONG}, {"l", DATATYPE_BASE_LONG}, {"h", DATATYPE_BASE_SHORT},
    {"L", DATATYPE_BASE_BIGLONG},   {"", DATATYPE_BASE_NONE},
};

/// The size modifiers that a conversion code accepts.
enum class ModifierRule { ANY, FLOATING, NONE };

constexpr bool isAllowed(ModifierRule rule, _DataType base) {
    switch (rule) {
    case ModifierRule::ANY:
        return base != DATATYPE_BAD;
    case ModifierRule::FLOATING:
        return base == DATATYPE_BASE_NONE || base == DATATYPE_BASE_LONG ||
               base == DATATYPE_BASE_BIGLONG;
    case ModifierRule::NONE:
        return base == DATATYPE_BASE_NONE;
    }
    return false;
}

/// A conversion code, its number within the data types, and where it is allowed.
struct ConversionCode {
    char code;
    int number;
    ModifierRule modifiers;
    bool scans;
    bool prints;
};

inline constexpr ConversionCode conversionCodes[] = {
    {'d', 1, ModifierRule::ANY, true, true},       {'i', 1, ModifierRule::ANY, true, true},
    {'o', 2, ModifierRule::ANY, true, true},       {'u', 3, ModifierRule::ANY, true, true},
    {'x', 4, ModifierRule::ANY, true, true},       {'X', 4, ModifierRule::ANY, false, true},
    {'e', 5, ModifierRule::FLOATING, true, true},  {'E', 5, ModifierRule::FLOATING, false, true},
    {'f', 6, ModifierRule::FLOATING, true, true},  {'g', 7, ModifierRule::FLOATING, true, true},
    {'G', 7, ModifierRule::FLOATING, false, true}, {'s', 8, ModifierRule::NONE, true, true},
    {'[', 8, ModifierRule::NONE, true, false},     {'c', 9, ModifierRule::NONE, true, true},
};

/// An escape in scan formats and print directives: the character after the backslash and what both
/// stand for. The list is complete: there are no form feeds and no numeric escapes.
struct Escape {
    char written;
    char meant;
};

inline constexpr Escape escapes[] = {
    {'"', '"'},  {'\'', '\''}, {'?', '?'},  {'\\', '\\'}, {'a', '\a'},
    {'b', '\b'}, {'n', '\n'},  {'r', '\r'}, {'t', '\t'},  {'v', '\v'},
};

inline constexpr int maxColumn = 1023;        ///< last column at which a field may start
inline constexpr int maxColumnCharacters = 4; ///< digits and ')', so columns actually end at 999
inline constexpr int maxScanWidth = 1023;     ///< maximum characters in a field
inline constexpr int maxScanWidthDigits = 4;
inline constexpr int maxPrintWidth = 256; ///< largest minimum width of a printed field
inline constexpr int maxPrintWidthDigits = 3;
inline constexpr int maxPrecision = 256;
inline constexpr int maxPrecisionCharacters = 3; ///< includes the point, so at most two digits
inline constexpr unsigned defaultTextSize = 31;  ///< maximum characters in a text without a width
inline constexpr std::string_view defaultTextWidth = "31";
inline constexpr std::string_view consumedCount = "%n"; ///< ends each scan directive

/// The character as an index.
constexpr unsigned char byteOf(char character) noexcept {
    return static_cast<unsigned char>(character);
}
/// White space as defined by the C library's scanner in the "C" locale.
constexpr bool isWhiteSpace(char character) noexcept {
    return character == ' ' || (character >= '\t' && character <= '\r');
}
/// The first character of the text that is not white space.
constexpr const char* skipWhiteSpace(const char* text) noexcept {
    while (isWhiteSpace(*text)) {
        ++text;
    }
    return text;
}
constexpr bool isDigit(char character) noexcept {
    return character >= '0' && character <= '9';
}

} // namespace zrm

#endif
