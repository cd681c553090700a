#include "host/framework/Request.h"

#include "base/LockGuard.h"
#include "framework/TableManager.h"
#include "host/framework/HandleTable.h"

#include <utility>

namespace zrm::host {

Request::Request(TableManager& manager, RequestDetail detail, RowReceiver& receiver,
                 RequestCounts* counts)
    : m_manager(manager), m_detail(std::move(detail)), m_context(receiver, counts),
      m_request(manager.CreateCtreq(&m_detail, &m_context)) {
    if (m_request != nullptr && m_request->handle() == 0) {
        m_request.reset();
    }
    // A report in the list would get live rows while it samples.
    if (m_request != nullptr && isSituation()) {
        const LockGuard guard(m_manager.lock());
        m_manager.requests().Add(m_request.get());
    }
}

Request::~Request() {
    if (m_request == nullptr) {
        return;
    }
    if (isSituation()) {
        const LockGuard guard(m_manager.lock());
        m_manager.requests().Remove(m_request.get());
        if (m_context.counts() != nullptr) {
            m_context.counts()->leaveAudience();
        }
    }
    // Waits for the pins while the object is still whole.
    HandleTable::close(m_request->handle());
}

} // namespace zrm::host
