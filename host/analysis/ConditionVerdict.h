#ifndef ZRM_HOST_CONDITION_VERDICT_H
#define ZRM_HOST_CONDITION_VERDICT_H

#include "host/framework/Condition.h"
#include "host/framework/RowLayout.h"

#include <cstdint>
#include <string>
#include <variant>

/// What became of one condition on one entry.
struct ConditionVerdict {
    std::string condition;                         ///< as operators write it
    std::variant<std::string, std::int64_t> value; ///< of the column
    bool holds = false;
    std::string refusal; ///< "ENTRYDESC 'Accepted' does not contain 'Failed'"; empty when it holds

    /// Judges the row of a table of this layout as the situation's requests do.
    static ConditionVerdict of(const Condition& condition, const RowLayout& layout, char* row);

    /// COLUMN OP VALUE.
    static std::string textOf(const Condition& condition);
};

#endif
