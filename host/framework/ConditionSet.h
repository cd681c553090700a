#ifndef ZRM_HOST_CONDITION_SET_H
#define ZRM_HOST_CONDITION_SET_H

#include "host/framework/CompiledCondition.h"

#include <vector>

namespace zrm::host {

class FilterList;

/// The conditions of one request on its rows, ready for evaluation, in the order in which a row is
/// refused soonest. The thresholds of a situation are not among them. Immutable once built; the
/// filters and the request must outlive it.
class ConditionSet {
public:
    /// Asks the request for its columns, so it must be fully constructed.
    ConditionSet(const FilterList& filters, ctreq& request);

    /// True when every condition holds; so also when there is none.
    bool holds(char* row) const;

    /// In the order of evaluation.
    const std::vector<CompiledCondition>& all() const noexcept { return m_conditions; }

private:
    ctreq& m_request;
    std::vector<CompiledCondition> m_conditions;
};

} // namespace zrm::host

#endif
