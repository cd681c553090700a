#ifndef ZRM_HOST_DELIVERY_H
#define ZRM_HOST_DELIVERY_H

#include "host/config/HostConfig.h"
#include "host/delivery/SinkThread.h"
#include "host/events/EventQueue.h"
#include "host/framework/RowLayout.h"
#include "host/history/History.h"

#include <memory>
#include <string>
#include <vector>

namespace zrm::host {

/// Delivers events: the queue, the history, and one thread per sink. With a history, each sink
/// reads committed events from its own position; without one, sinks read from the queue. start and
/// finish are called by one thread at a time, the rest by any.
class Delivery {
public:
    /// Creates the queue for rows of this layout, and the history if configured; starts no thread.
    /// If the history cannot be opened, says why and continues without it.
    Delivery(const HostConfig& config, const RowLayout& layout, std::size_t rowSize);
    ~Delivery();
    Delivery(const Delivery&) = delete;
    Delivery& operator=(const Delivery&) = delete;

    /// The queue that takes new events; lives as long as the object. Before finish, any thread.
    EventQueue& queue() noexcept { return m_queue; }

    void start();

    /// Stores and delivers what is queued, until the limit at the latest, and ends the threads.
    /// Says which sinks did not get everything. May be called more than once.
    void finish(EventQueue::Clock::time_point limit);

    /// The history; null when it is off. Lives as long as the object.
    History* history() noexcept { return m_history.get(); }

    /// Why there is no history although one is configured; otherwise empty.
    const std::string& historyProblem() const noexcept { return m_historyProblem; }

    /// The state of the queue.
    QueueState queueState() const { return m_queue.state(); }

    /// The state of each sink, in configuration order.
    std::vector<SinkState> sinkStates() const;

private:
    std::unique_ptr<EventSource> source(const SinkConfig& sink);
    void finishSinks(EventQueue::Clock::time_point limit);

    const EventJson m_format;
    std::string m_historyProblem;
    const std::unique_ptr<History> m_history; ///< null: off
    EventQueue m_queue;
    std::vector<std::unique_ptr<SinkThread>> m_sinks;
    bool m_finished = false;
};

} // namespace zrm::host

#endif
