#ifndef ZRM_HOST_SINK_THREAD_H
#define ZRM_HOST_SINK_THREAD_H

#include "host/base/RetryPause.h"
#include "host/events/Event.h"
#include "host/events/EventSource.h"
#include "host/sinks/Sink.h"

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <mutex>
#include <optional>
#include <span>
#include <stop_token>
#include <string>
#include <thread>
#include <vector>

namespace zrm::host {

/// The state of the delivery to one sink.
struct SinkState {
    enum class Condition {
        STARTING, ///< nothing has been offered yet
        UP,       ///< the last delivery was complete
        FAILING,  ///< the last delivery was not and will be retried, or the current one is stuck
    };

    std::string name;
    std::string type; ///< as the configuration has it: "jsonl"
    Condition condition = Condition::STARTING;
    std::uint64_t lag = 0;       ///< events that it has not got yet
    std::uint64_t delivered = 0; ///< events that it got since the agent's start
    std::uint64_t failures = 0;  ///< deliveries that were not complete
    std::string error;           ///< why the last delivery failed; empty if it did not
    std::optional<std::chrono::milliseconds> retryIn; ///< until the next try, while it waits

    /// The condition's name: "starting", "up" or "failing".
    const char* conditionName() const noexcept {
        return condition == Condition::UP        ? "up"
               : condition == Condition::FAILING ? "failing"
                                                 : "starting";
    }
};

/// Delivers events from their source to one sink on its own thread. A failed delivery is retried
/// after growing pauses: while a sink is down, its events stay in the source. Nothing is skipped
/// but what a silence holds back.
class SinkThread {
public:
    using Clock = std::chrono::steady_clock;

    /// `type` is the sink's type in the configuration.
    SinkThread(std::unique_ptr<EventSource> source, std::unique_ptr<Sink> sink, std::string type);
    SinkThread(const SinkThread&) = delete;
    SinkThread& operator=(const SinkThread&) = delete;
    /// Ends the thread at once if finish was not called.
    ~SinkThread();

    /// Starts the thread.
    void start();

    /// Ends the source and cuts pauses short, so that a thread which can deliver the rest does so
    /// now. Not on the sink's own thread; may be called more than once.
    void beginFinish();

    /// Calls beginFinish and ends the thread when it has delivered everything, at the limit at the
    /// latest, or a second later if it does not give up at once. A thread blocked in the system is
    /// left running until the object is destroyed. Returns the number of undelivered events. Not on
    /// the sink's own thread; may be called more than once.
    std::uint64_t finish(Clock::time_point limit);

    std::string name() const { return m_sink->name(); }

    /// The state of delivery. Any thread.
    SinkState state() const;

private:
    void run();
    std::size_t deliver(std::span<const EventRecord> events);
    std::size_t deliverAudible(std::span<const EventRecord> events);
    std::size_t offer(std::span<const EventRecord> events);
    std::string error() const { return m_exception.empty() ? m_sink->error() : m_exception; }
    void note(std::size_t delivered, bool failed);
    void tellOfFailure();
    void pause();
    void noteStall(SinkState& state) const;

    const std::unique_ptr<EventSource> m_source;
    const std::unique_ptr<Sink> m_sink;
    const std::string m_type;
    RetryPause m_pause;
    std::vector<EventRecord> m_audible; ///< of the last read: those that no silence holds back
    std::string m_exception;            ///< what the last delivery threw; empty if nothing

    mutable std::mutex m_mutex; ///< guards the members below
    std::condition_variable m_changed;
    SinkState m_state; ///< without the parts that come from the source or depend on the time
    Clock::time_point m_nextTry{}; ///< during a pause; otherwise the epoch
    bool m_finishing = false;      ///< finish was called: pauses stay short
    bool m_ended = true;           ///< the thread's work is done
    std::stop_source m_giveUp;
    std::thread m_thread;
};

} // namespace zrm::host

#endif
