#include "host/analysis/ConditionVerdict.h"

#include "host/config/ConditionBuilder.h"
#include "host/events/RowText.h"
#include "host/framework/FieldCondition.h"

#include <algorithm>
#include <iterator>
#include <optional>
#include <string_view>
#include <utility>

namespace zrm::host {

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
        if (!condition.isNumber) {
            return quoted(condition.text);
        }
        return condition.isOnField() ? condition.text : std::to_string(condition.number);
    }
    std::string list;
    for (const std::string& value : condition.values) {
        list += (list.empty() ? "" : ", ") + (condition.isNumber ? value : quoted(value));
    }
    return '[' + list + ']';
}

/// The words between a column's value and that of a condition which does not hold.
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
    return ConditionBuilder::written(condition.column) + ' ' +
           std::string(ConditionBuilder::nameOf(condition.op)) + ' ' + valueOf(condition);
}

ConditionJudge::ConditionJudge(std::vector<Condition> conditions, const RowLayout& layout)
    : m_conditions(std::move(conditions)), m_layout(layout), m_filters(m_conditions) {
    m_compiled.reserve(m_conditions.size());
    for (const SEL1_FILTERINFO& filter : m_filters.all()) {
        m_compiled.emplace_back(filter, layout.find(filter.columnName));
    }
}

std::vector<ConditionVerdict> ConditionJudge::judge(char* row) const {
    std::vector<ConditionVerdict> verdicts;
    verdicts.reserve(m_conditions.size());
    for (std::size_t index = 0; index < m_conditions.size(); ++index) {
        verdicts.push_back(verdict(index, row));
    }
    return verdicts;
}

/// Judges a condition on a field, whose value is null if the entry does not have the field.
void ConditionJudge::judgeField(std::size_t index, ConditionVerdict& verdict) const {
    const Condition& condition = m_conditions[index];
    const FieldCondition& onField = *m_compiled[index].onField();
    const std::string field = ConditionBuilder::written(condition.column);
    const std::optional<std::string_view> value = onField.value();
    verdict.holds = onField.holds();
    if (!value) {
        verdict.value = nullptr;
        verdict.refusal = verdict.holds ? "" : "the entry has no " + field;
        return;
    }
    std::string room;
    const std::string text(RowText::ofLocal(*value, room));
    verdict.value = text;
    if (!verdict.holds && condition.isNumber && !FieldNumber::of(*value)) {
        verdict.refusal = field + ' ' + quoted(text) + " is not a number";
    } else if (!verdict.holds) {
        verdict.refusal =
            field + ' ' + quoted(text) + ' ' + denial(condition.op) + ' ' + valueOf(condition);
    }
}

ConditionVerdict ConditionJudge::verdict(std::size_t index, char* row) const {
    const Condition& condition = m_conditions[index];
    ConditionVerdict verdict;
    verdict.condition = ConditionVerdict::textOf(condition);
    const RowColumn* const column = m_layout.find(condition.column);
    if (m_compiled[index].onField() != nullptr) {
        judgeField(index, verdict);
        return verdict;
    }
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
    verdict.holds = m_compiled[index].holds(nullptr, row);
    if (!verdict.holds) {
        verdict.refusal =
            condition.column + ' ' + shown + ' ' + denial(condition.op) + ' ' + valueOf(condition);
    }
    return verdict;
}

} // namespace zrm::host
