#include "host/http/ActiveSamples.h"

namespace {

/// Samples of this thread: the thread that ends the process does not wait for itself.
thread_local int ownSamples = 0;

} // namespace

ActiveSamples::Guard::Guard(ActiveSamples& samples) : m_samples(samples) {
    const std::lock_guard guard(m_samples.m_mutex);
    m_isCounted = !m_samples.m_isClosed;
    if (m_isCounted) {
        ++m_samples.m_count;
        ++ownSamples;
    }
}

ActiveSamples::Guard::~Guard() {
    if (!m_isCounted) {
        return;
    }
    --ownSamples;
    {
        const std::lock_guard guard(m_samples.m_mutex);
        --m_samples.m_count;
    }
    m_samples.m_ended.notify_all();
}

void ActiveSamples::close(std::chrono::steady_clock::time_point limit) {
    std::unique_lock lock(m_mutex);
    m_isClosed = true;
    m_ended.wait_until(lock, limit, [&] { return m_count <= ownSamples; });
}
