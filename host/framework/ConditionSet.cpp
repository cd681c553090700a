#include "host/framework/ConditionSet.h"

#include "framework/ctreq.h"
#include "host/framework/FilterList.h"

#include <algorithm>

namespace zrm::host {

ConditionSet::ConditionSet(const FilterList& filters, ctreq& request) : m_request(request) {
    const RowLayout layout(request);
    m_conditions.reserve(filters.all().size());
    const bool isSituation = request.sampleType() == SAMPLE_SITUATION;
    for (const SEL1_FILTERINFO& filter : filters.all()) {
        if (isSituation && isThresholdColumn(filter.columnName)) {
            continue;
        }
        m_conditions.emplace_back(filter, layout.find(filter.columnName));
    }
    std::stable_sort(m_conditions.begin(), m_conditions.end(),
                     [](const CompiledCondition& left, const CompiledCondition& right) {
                         return left.rank() < right.rank();
                     });
}

bool ConditionSet::holds(char* row) const {
    return std::all_of(m_conditions.begin(), m_conditions.end(),
                       [this, row](const CompiledCondition& condition) {
                           return condition.holds(&m_request, row);
                       });
}

} // namespace zrm::host
