#ifndef ZRM_PRINT_OPTIONS_H
#define ZRM_PRINT_OPTIONS_H

#include "parser/DataType.h"

namespace zrm {

/// The options of print directives, as bits of a set.
enum PrintOptionFlag : unsigned {
    OPTION_GROUPING = 1,
    OPTION_LEFT = 2,
    OPTION_SIGN = 4,
    OPTION_BLANK = 8,
    OPTION_ALTERNATE = 16,
    OPTION_ZERO = 32,
};

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
    {' ', OPTION_BLANK, OptionTypes::SIGNED, OptionRefusal::OPTION, OPTION_SIGN, true},
    {'#', OPTION_ALTERNATE, OptionTypes::NUMBERS, OptionRefusal::OPTION, 0, false},
    {'\'', OPTION_GROUPING, OptionTypes::GROUPED, OptionRefusal::THOUSANDS, 0, false},
    {'-', OPTION_LEFT, OptionTypes::ALL, OptionRefusal::OPTION, OPTION_ZERO, false},
    {'0', OPTION_ZERO, OptionTypes::NUMBERS, OptionRefusal::ZERO, OPTION_LEFT, true},
    {'+', OPTION_SIGN, OptionTypes::SIGNED, OptionRefusal::OPTION, OPTION_BLANK, false},
};

} // namespace zrm

#endif
