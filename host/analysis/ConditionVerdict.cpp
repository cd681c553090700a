#include "host/analysis/ConditionVerdict.h"

#include "host/config/ConditionBuilder.h"
#include "host/events/RowText.h"
#include "host/framework/CompiledCondition.h"
#include "host/framework/FilterList.h"

#include <algorithm>
#include <iterator>
#include <vector>

namespace {

std::string quoted(const std::string& text) {
    std::string result = "'";
    for (const char c : text) {
        result += c == '\'' ? "''" : std::string(1, c);
    }
    return result + '\'';
}

std::string valueOf(const Condition& condition) {
    if (condition.op != INTF_IN) {
        return condition.isNumber ? std::to_string(condition.number) : quoted(condition.text);
    }
    std::string list;
    for (const std::string& value : condition.values) {
        list += (list.empty() ? "" : ", ") + (condition.isNumber ? value : quoted(value));
    }
    return '[' + list + ']';
}

/// What stands between a column's value and that of a condition which does not hold.
const char* denial(_IntfOper op) {
    struct Denial {
        _IntfOper op;
        const char* text;
    };
    static constexpr Denial denials[] = {
        {INTF_EQUAL, "is not"},
        {INTF_NOT_EQUAL, "is"},
        {INTF_GREATER_OR_EQUAL, "is less than"},
        {INTF_LESS_OR_EQUAL, "is greater than"},
        {INTF_LESS, "is not less than"},
        {INTF_GREATER, "is not greater than"},
        {INTF_CONTAINS, "does not contain"},
        {INTF_STARTS, "does not start with"},
        {INTF_MATCHES, "does not match"},
        {INTF_IN, "is none of"},
    };
    const auto* const found = std::find_if(std::begin(denials), std::end(denials),
                                           [op](const Denial& known) { return known.op == op; });
    return found == std::end(denials) ? "does not meet" : found->text;
}

} // namespace

std::string ConditionVerdict::textOf(const Condition& condition) {
    return condition.column + ' ' + std::string(ConditionBuilder::nameOf(condition.op)) + ' ' +
           valueOf(condition);
}

ConditionVerdict ConditionVerdict::of(const Condition& condition, const RowLayout& layout,
                                      char* row) {
    ConditionVerdict verdict;
    verdict.condition = textOf(condition);
    const RowColumn* const column = layout.find(condition.column);
    if (column == nullptr) {
        verdict.refusal = "the entry has no column " + condition.column;
        return verdict;
    }
    std::string shown;
    if (column->isInteger()) {
        verdict.value = std::int64_t{column->integer(row)};
        shown = std::to_string(column->integer(row));
    } else {
        std::string room;
        const std::string text(RowText::of(*column, row, room));
        verdict.value = text;
        shown = quoted(text);
    }
    const std::vector<Condition> one = {condition};
    const FilterList filters(one);
    verdict.holds = CompiledCondition(filters.all().front(), column).holds(nullptr, row);
    if (!verdict.holds) {
        verdict.refusal =
            condition.column + ' ' + shown + ' ' + denial(condition.op) + ' ' + valueOf(condition);
    }
    return verdict;
}
