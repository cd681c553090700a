#ifndef ZRM_HOST_DELIVERY_H
#define ZRM_HOST_DELIVERY_H

#include "host/config/HostConfig.h"
#include "host/delivery/SinkState.h"
#include "host/delivery/SinkThread.h"
#include "host/events/EventQueue.h"
#include "host/framework/RowLayout.h"
#include "host/history/History.h"

#include <memory>
#include <string>
#include <vector>

namespace zrm::host {

/// The way of events out of the process: the queue, the history, and one thread per sink. With a
/// history the sinks get what it has committed, each from a place of its own; without one they
/// get what is in the queue. start and finish are called by one thread at a time, the rest by any.
class Delivery {
public:
    /// Room for events of rows of this layout, and the history where the configuration wants one;
    /// no thread runs yet. Where there can be no history, it says why, and goes on without it.
    Delivery(const HostConfig& config, const RowLayout& layout, std::size_t rowSize);
    ~Delivery();
    Delivery(const Delivery&) = delete;
    Delivery& operator=(const Delivery&) = delete;

    /// Where events are put; lives as long as the object. Before finish, any thread.
    EventQueue& queue() noexcept { return m_queue; }

    void start();

    /// Stores and delivers what is queued, at the latest until the limit, and ends the threads.
    /// Says which sink did not get everything. Any number of times.
    void finish(EventQueue::Clock::time_point limit);

    /// The history; null when it is off. Lives as long as the object.
    History* history() noexcept { return m_history.get(); }

    /// Why there is no history although the configuration wants one; else empty.
    const std::string& historyProblem() const noexcept { return m_historyProblem; }

    /// How the queue stands.
    QueueState queueState() const { return m_queue.state(); }

    /// How each sink stands, in the order of the configuration.
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
