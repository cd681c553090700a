#ifndef ZRM_HOST_SINK_THREAD_H
#define ZRM_HOST_SINK_THREAD_H

#include "host/base/RetryPause.h"
#include "host/delivery/SinkState.h"
#include "host/events/EventRecord.h"
#include "host/events/EventSource.h"
#include "host/sinks/Sink.h"

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <mutex>
#include <span>
#include <stop_token>
#include <string>
#include <thread>

namespace zrm::host {

/// Carries events from their source to one sink, on a thread of its own. A delivery that fails is
/// tried again after growing pauses, and nothing is passed over: while a sink is down its events
/// stay where they are.
class SinkThread {
public:
    using Clock = std::chrono::steady_clock;

    /// `type` is the sink's in the configuration.
    SinkThread(std::unique_ptr<EventSource> source, std::unique_ptr<Sink> sink, std::string type);
    SinkThread(const SinkThread&) = delete;
    SinkThread& operator=(const SinkThread&) = delete;
    /// Ends the thread at once when finish was not called.
    ~SinkThread();

    /// Starts the thread.
    void start();

    /// Ends the source and cuts pauses short: a thread that can deliver the rest does so from now
    /// on. Not on the sink's own thread; any number of times.
    void beginFinish();

    /// Does that, and ends the thread when it has delivered everything, at the latest at the
    /// limit, or a second later when it does not give up at once. One that does not give up at all,
    /// since the system does not let it, is left alone until the object is destroyed. Returns the
    /// number of events that were not delivered. Not on the sink's own thread; any number of times.
    std::uint64_t finish(Clock::time_point limit);

    std::string name() const { return m_sink->name(); }

    /// How the delivery stands. Any thread.
    SinkState state() const;

private:
    void run();
    std::size_t deliver(std::span<const EventRecord> events);
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
    std::string m_exception; ///< what the last delivery threw; empty when it did not

    mutable std::mutex m_mutex; ///< guards what follows
    std::condition_variable m_changed;
    SinkState m_state;             ///< without what belongs to the source or to the moment
    Clock::time_point m_nextTry{}; ///< while a pause runs; else the beginning of time
    bool m_finishing = false;      ///< finish was called: pauses stay short
    bool m_ended = true;           ///< the thread's work is done
    std::stop_source m_giveUp;
    std::thread m_thread;
};

} // namespace zrm::host

#endif
