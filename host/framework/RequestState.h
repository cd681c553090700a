#ifndef ZRM_HOST_REQUEST_STATE_H
#define ZRM_HOST_REQUEST_STATE_H

#include "framework/ctreq.h"
#include "host/framework/ConditionSet.h"
#include "host/framework/FilterList.h"
#include "host/framework/Request.h"

#include <atomic>
#include <cstddef>
#include <optional>

/// What the host keeps with a request. Used by the thread that uses the request.
class ctreq::Framework {
    std::optional<zrm::host::ConditionSet> m_conditions;
    zrm::host::RequestCounts m_ownCounts;

public:
    /// Both must outlive the object, and so do the context's counts where it has any.
    Framework(const RequestDetail& detail, ContextInfo& context)
        : filters(detail.conditions), receiver(context.receiver()),
          counts(context.counts() != nullptr ? *context.counts() : m_ownCounts) {}

    /// The conditions of the request, ready for evaluation. The first call queries the table's
    /// columns, which must be known by then.
    const zrm::host::ConditionSet& conditionsOf(ctreq& request) {
        if (!m_conditions) {
            m_conditions.emplace(filters, request);
        }
        return *m_conditions;
    }

    zrm::host::FilterList filters;
    zrm::host::RowReceiver& receiver;
    zrm::host::RequestCounts& counts;
    std::atomic<bool> stopped{false};
    std::size_t capacity = 0; ///< rows that fit into the allocated data array
};

#endif
