#ifndef ZRM_HOST_CONDITION_PARSER_H
#define ZRM_HOST_CONDITION_PARSER_H

#include "host/config/ConditionBuilder.h"

#include <string_view>

namespace zrm::host {

/// Parses one condition of the condition language: COLUMN OP VALUE. Text is in single quotes, where
/// two quotes in a row mean one; numbers have no quotes; `in` takes a list in brackets. Immutable.
class ConditionParser {
public:
    explicit ConditionParser(std::string_view table) : m_builder(table) {}

    /// The condition, or the first problem. Conditions that belong together share a budget.
    Result<Condition> parse(std::string_view text, PatternBudget& budget) const;
    /// The same for a single condition.
    Result<Condition> parse(std::string_view text) const {
        PatternBudget budget;
        return parse(text, budget);
    }

private:
    ConditionBuilder m_builder;
};

} // namespace zrm::host

#endif
