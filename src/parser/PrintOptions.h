#ifndef ZRM_PRINT_OPTIONS_H
#define ZRM_PRINT_OPTIONS_H

#include "parser/DataType.h"

namespace zrm {

// The options of print directives, as bits of a set.
inline constexpr unsigned groupingFlag = 1;
inline constexpr unsigned leftFlag = 2;
inline constexpr unsigned signFlag = 4;
inline constexpr unsigned blankFlag = 8;
inline constexpr unsigned alternateFlag = 16;
inline constexpr unsigned zeroFlag = 32;

/// The scan data types that an option applies to.
enum class OptionTypes { ALL, SIGNED, GROUPED, NUMBERS };

constexpr bool isAllowed(OptionTypes types, const DataTypeInfo& scanned) {
    switch (types) {
    case OptionTypes::ALL:
        return true;
    case OptionTypes::SIGNED:
        return scanned.signOptions;
    case OptionTypes::GROUPED:
        return scanned.groupingOption;
    case OptionTypes::NUMBERS:
        return scanned.receiver != Receiver::TEXT && scanned.receiver != Receiver::CHARACTER;
    }
    return false;
}

/// The message texts for rejected options. They differ, even in their blanks.
enum class OptionRefusal { OPTION, THOUSANDS, ZERO };

/// One option: the types it applies to, and the earlier option it conflicts with.
struct PrintOption {
    char character;
    unsigned flag;
    OptionTypes types;
    OptionRefusal refusal;
    unsigned rival;  ///< flag of the conflicting earlier option; 0: none
    bool isYielding; ///< the rival wins and this option is dropped
};

inline constexpr PrintOption printOptions[] = {
    {' ', blankFlag, OptionTypes::SIGNED, OptionRefusal::OPTION, signFlag, true},
    {'#', alternateFlag, OptionTypes::NUMBERS, OptionRefusal::OPTION, 0, false},
    {'\'', groupingFlag, OptionTypes::GROUPED, OptionRefusal::THOUSANDS, 0, false},
    {'-', leftFlag, OptionTypes::ALL, OptionRefusal::OPTION, zeroFlag, false},
    {'0', zeroFlag, OptionTypes::NUMBERS, OptionRefusal::ZERO, leftFlag, true},
    {'+', signFlag, OptionTypes::SIGNED, OptionRefusal::OPTION, blankFlag, false},
};

} // namespace zrm

#endif
