#ifndef ZRM_HOST_RECENT_EVENTS_H
#define ZRM_HOST_RECENT_EVENTS_H

#include "host/history/EventBatch.h"

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <cstdint>
#include <deque>
#include <memory>
#include <mutex>
#include <stop_token>

namespace zrm::host {

/// The newest committed events, in memory: readers that keep up read them here instead of from the
/// file. Wakes waiting readers when there are more. Any thread.
class RecentEvents {
public:
    using Clock = std::chrono::steady_clock;

    /// Keeps about this many bytes at most, but at least the newest batch. `newest` is the id of
    /// the newest event committed so far.
    RecentEvents(std::size_t bytes, std::uint64_t newest);
    RecentEvents(const RecentEvents&) = delete;
    RecentEvents& operator=(const RecentEvents&) = delete;

    /// Adds a committed, non-empty batch whose ids follow the newest.
    void publish(std::shared_ptr<const EventBatch> batch);

    /// The id of the newest committed event; 0 when there was none.
    std::uint64_t newest() const noexcept { return m_newest.load(std::memory_order_acquire); }

    /// The batch with the event that follows `id`; null when it is not in memory.
    std::shared_ptr<const EventBatch> after(std::uint64_t id) const;

    /// The oldest batch in memory; null when there is none.
    std::shared_ptr<const EventBatch> oldest() const;

    /// Waits until an event with a greater id arrives, the time is up, a stop is requested or end
    /// is called. Returns newest().
    std::uint64_t waitBeyond(std::uint64_t id, Clock::time_point limit,
                             const std::stop_token& stop) const;

    /// No more events will follow. Ends all waits.
    void end();
    bool ended() const noexcept { return m_ended.load(std::memory_order_acquire); }

private:
    const std::size_t m_mostBytes;
    std::atomic<std::uint64_t> m_newest; ///< changed with the mutex held
    std::atomic<bool> m_ended{false};    ///< changed with the mutex held

    mutable std::mutex m_mutex;
    mutable std::condition_variable_any m_changed;
    std::deque<std::shared_ptr<const EventBatch>> m_batches; ///< by id
    std::size_t m_bytes = 0;                                 ///< of the batches
};

} // namespace zrm::host

#endif
