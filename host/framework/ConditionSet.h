#ifndef ZRM_HOST_CONDITION_SET_H
#define ZRM_HOST_CONDITION_SET_H

#include "host/framework/CompiledCondition.h"

#include <vector>

namespace zrm::host {

class FilterList;

/// The conditions of one request on its rows, prepared for evaluation and ordered so that rows are
/// refused as early as possible. A situation's thresholds are not included. Immutable once built;
/// the filters and the request must outlive it.
class ConditionSet {
public:
    /// Asks the request for its columns, so the request must be fully constructed.
    ConditionSet(const FilterList& filters, ctreq& request);

    /// True when every condition holds, also when there is none.
    bool holds(char* row) const;

    /// In the order of evaluation.
    const std::vector<CompiledCondition>& all() const noexcept { return m_conditions; }

private:
    ctreq& m_request;
    std::vector<CompiledCondition> m_conditions;
};

} // namespace zrm::host

#endif
