#ifndef ZRM_HOST_CONDITION_VERDICT_H
#define ZRM_HOST_CONDITION_VERDICT_H

#include "host/framework/CompiledCondition.h"
#include "host/framework/Condition.h"
#include "host/framework/FilterList.h"
#include "host/framework/RowLayout.h"

#include <cstddef>
#include <cstdint>
#include <string>
#include <variant>
#include <vector>

namespace zrm::host {

/// The result of checking one condition against one entry.
struct ConditionVerdict {
    std::string condition; ///< as operators write it
    /// Of the column or field; null for a field that the entry does not have.
    std::variant<std::string, std::int64_t, std::nullptr_t> value;
    bool holds = false;
    std::string refusal; ///< "ENTRYDESC 'Accepted' does not contain 'Failed'"; empty when it holds

    /// COLUMN OP VALUE.
    static std::string textOf(const Condition& condition);
};

/// Checks rows against conditions one by one, as a situation's requests do. Used by one thread.
class ConditionJudge {
public:
    /// The rows have this layout, which must outlive the object.
    ConditionJudge(std::vector<Condition> conditions, const RowLayout& layout);
    ConditionJudge(const ConditionJudge&) = delete;
    ConditionJudge& operator=(const ConditionJudge&) = delete;

    /// In the order of the conditions.
    std::vector<ConditionVerdict> judge(char* row) const;

private:
    ConditionVerdict verdict(std::size_t index, char* row) const;
    void judgeField(std::size_t index, ConditionVerdict& verdict) const;

    const std::vector<Condition> m_conditions;
    const RowLayout& m_layout;
    const FilterList m_filters;
    std::vector<CompiledCondition> m_compiled;
};

} // namespace zrm::host

#endif
