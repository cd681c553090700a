#include "host/http/ActiveRequests.h"

namespace zrm::host {

namespace {

/// Requests of this thread: a thread that ends the process must not wait for itself.
thread_local int ownRequests = 0;

} // namespace

ActiveRequests::Guard::Guard(ActiveRequests& requests) : m_requests(requests) {
    const std::lock_guard guard(m_requests.m_mutex);
    m_isCounted = !m_requests.m_isClosed;
    if (m_isCounted) {
        ++m_requests.m_count;
        ++ownRequests;
    }
}

ActiveRequests::Guard::~Guard() {
    if (!m_isCounted) {
        return;
    }
    --ownRequests;
    {
        const std::lock_guard guard(m_requests.m_mutex);
        --m_requests.m_count;
    }
    m_requests.m_ended.notify_all();
}

void ActiveRequests::close(std::chrono::steady_clock::time_point limit) {
    std::unique_lock lock(m_mutex);
    m_isClosed = true;
    m_ended.wait_until(lock, limit, [&] { return m_count <= ownRequests; });
}

} // namespace zrm::host
