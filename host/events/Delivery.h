#ifndef ZRM_HOST_DELIVERY_H
#define ZRM_HOST_DELIVERY_H

#include "host/config/HostConfig.h"
#include "host/events/EventQueue.h"
#include "host/events/SinkState.h"
#include "host/events/SinkThread.h"
#include "host/framework/RowLayout.h"

#include <memory>
#include <vector>

class HistoryReader;

/// The way of events out of the process: the queue and one thread per sink. start and finish are
/// called by one thread at a time, the rest by any.
class Delivery {
public:
    /// Room for events of rows of this layout; no thread runs yet.
    Delivery(const std::vector<SinkConfig>& sinks, const RowLayout& layout, std::size_t rowSize);
    Delivery(const Delivery&) = delete;
    Delivery& operator=(const Delivery&) = delete;

    /// Where events are put; lives as long as the object. Before finish, any thread.
    EventQueue& queue() noexcept { return m_queue; }

    void start();

    /// Delivers what is queued, at the latest until the limit, and ends the threads. Says which
    /// sink did not get everything. Any number of times.
    void finish(EventQueue::Clock::time_point limit);

    /// The history; null when it is off. Lives as long as the object.
    HistoryReader* history() noexcept { return nullptr; }

    /// How the queue stands.
    QueueState queueState() const { return m_queue.state(); }

    /// How each sink stands, in the order of the configuration.
    std::vector<SinkState> sinkStates() const;

private:
    EventQueue m_queue;
    std::vector<std::unique_ptr<SinkThread>> m_sinks;
};

#endif
