#include "host/history/RecentEvents.h"

#include <algorithm>
#include <utility>

namespace zrm::host {

RecentEvents::RecentEvents(std::size_t bytes, std::uint64_t newest)
    : m_mostBytes(bytes), m_newest(newest) {}

void RecentEvents::publish(std::shared_ptr<const EventBatch> batch) {
    {
        const std::lock_guard guard(m_mutex);
        m_newest.store(batch->last(), std::memory_order_release);
        m_bytes += batch->bytes();
        m_batches.push_back(std::move(batch));
        while (m_bytes > m_mostBytes && m_batches.size() > 1) {
            m_bytes -= m_batches.front()->bytes();
            m_batches.pop_front();
        }
    }
    m_changed.notify_all();
}

std::shared_ptr<const EventBatch> RecentEvents::after(std::uint64_t id) const {
    const std::lock_guard guard(m_mutex);
    if (m_batches.empty() || m_batches.front()->first() > id + 1) {
        return nullptr;
    }
    const auto found =
        std::partition_point(m_batches.begin(), m_batches.end(),
                             [id](const auto& batch) { return batch->last() <= id; });
    return found == m_batches.end() ? nullptr : *found;
}

std::shared_ptr<const EventBatch> RecentEvents::oldest() const {
    const std::lock_guard guard(m_mutex);
    return m_batches.empty() ? nullptr : m_batches.front();
}

std::uint64_t RecentEvents::waitBeyond(std::uint64_t id, Clock::time_point limit,
                                       const std::stop_token& stop) const {
    if (newest() <= id && !ended()) {
        std::unique_lock lock(m_mutex);
        const auto hasMore = [&] { return newest() > id || ended(); };
        if (limit == Clock::time_point::max()) {
            m_changed.wait(lock, stop, hasMore);
        } else {
            m_changed.wait_until(lock, stop, limit, hasMore);
        }
    }
    return newest();
}

void RecentEvents::end() {
    {
        const std::lock_guard guard(m_mutex);
        m_ended.store(true, std::memory_order_release);
    }
    m_changed.notify_all();
}

} // namespace zrm::host
