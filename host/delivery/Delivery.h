#ifndef ZRM_HOST_DELIVERY_H
#define ZRM_HOST_DELIVERY_H

#include "host/config/HostConfig.h"
#include "host/delivery/SinkThread.h"
#include "host/events/EventQueue.h"
#include "host/framework/RowLayout.h"
#include "host/history/History.h"
#include "host/silences/Silences.h"

#include <memory>
#include <string>
#include <vector>

namespace zrm::host {

/// The history that the configuration asks for.
struct OpenedHistory {
    std::unique_ptr<History> history; ///< null: off
    std::string problem;              ///< why it is off although it is configured; otherwise empty
};

/// Opens it; if it cannot be opened, says why. From now on logs are followed from the positions
/// that it holds.
OpenedHistory openHistory(const HostConfig& config);

/// Delivers events: the queue, the history, and one thread per sink. With a history, each sink
/// reads committed events from its own position; without one, sinks read from the queue. start and
/// finish are called by one thread at a time, the rest by any.
class Delivery {
public:
    /// Creates the queue for rows of this layout; starts no thread.
    Delivery(const HostConfig& config, const RowLayout& layout, std::size_t rowSize,
             OpenedHistory&& opened);
    ~Delivery();
    Delivery(const Delivery&) = delete;
    Delivery& operator=(const Delivery&) = delete;

    /// The queue that takes new events; lives as long as the object. Before finish, any thread.
    EventQueue& queue() noexcept { return m_queue; }

    void start();

    /// From now on the events and positions of followed logs are no longer taken: the situations
    /// are about to close, and the next run judges again what comes now.
    void closePositions() noexcept { m_positions->close(); }

    /// Stores and delivers what is queued, until the limit at the latest, and ends the threads.
    /// Says which sinks did not get everything. May be called more than once.
    void finish(EventQueue::Clock::time_point limit);

    /// The history; null when it is off. Lives as long as the object.
    History* history() noexcept { return m_history.get(); }

    /// Why there is no history although one is configured; otherwise empty.
    const std::string& historyProblem() const noexcept { return m_historyProblem; }

    /// The silences: the history's, or without one those of this run.
    Silences& silences() noexcept {
        return m_history == nullptr ? m_unkeptSilences : m_history->silences();
    }

    /// The state of the queue.
    QueueState queueState() const { return m_queue.state(); }

    /// The state of each sink, in configuration order.
    std::vector<SinkState> sinkStates() const;

private:
    std::unique_ptr<EventSource> source(const SinkConfig& sink);
    void finishSinks(EventQueue::Clock::time_point limit);

    const EventJson m_format;
    const std::string m_historyProblem;
    const std::unique_ptr<History> m_history; ///< null: off
    Silences m_unkeptSilences;                ///< while there is no history
    EventQueue m_queue;
    const std::shared_ptr<PositionBook> m_positions;
    std::vector<std::unique_ptr<SinkThread>> m_sinks;
    bool m_finished = false;
};

} // namespace zrm::host

#endif
