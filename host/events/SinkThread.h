#ifndef ZRM_HOST_SINK_THREAD_H
#define ZRM_HOST_SINK_THREAD_H

#include "host/events/EventJson.h"
#include "host/events/EventQueue.h"
#include "host/events/EventRecord.h"
#include "host/events/Sink.h"

#include <condition_variable>
#include <cstddef>
#include <memory>
#include <mutex>
#include <stop_token>
#include <string>
#include <thread>
#include <vector>

/// Carries events from the queue to one sink, on a thread and with a cursor of its own. A delivery
/// that fails is tried again after growing pauses, and nothing is passed over: while a sink is
/// down its events stay in the queue.
class SinkThread {
public:
    using Clock = EventQueue::Clock;

    /// Takes a place among the queue's readers; the queue outlives the object.
    SinkThread(EventQueue& queue, EventJson format, std::unique_ptr<Sink> sink);
    SinkThread(const SinkThread&) = delete;
    SinkThread& operator=(const SinkThread&) = delete;
    /// Ends the thread at once when finish was not called.
    ~SinkThread();

    /// Starts the thread.
    void start();

    /// Ends the thread when it has delivered everything, at the latest at the limit; the queue is
    /// closed by then. Returns the number of events that were not delivered. Not on the sink's own
    /// thread; any number of times.
    std::size_t finish(Clock::time_point limit);

    std::string name() const { return m_sink->name(); }

private:
    void run();
    std::size_t deliver(std::span<const Event> events);
    std::span<const EventRecord> recordsOf(std::span<const Event> events);
    void failed();
    void pause();

    EventQueue& m_queue;
    const EventQueue::Reader m_reader;
    const EventJson m_format;
    std::unique_ptr<Sink> m_sink;
    std::vector<std::string> m_texts;    ///< of one delivery: the events as JSON
    std::vector<std::string> m_logs;     ///< of one delivery: the logs
    std::vector<EventRecord> m_records;  ///< of one delivery; views into the texts
    bool m_failing = false;              ///< the last delivery failed
    std::chrono::milliseconds m_pause{}; ///< before the next try

    std::mutex m_mutex;
    std::condition_variable m_changed;
    bool m_finishing = false; ///< finish was called: pauses stay short
    bool m_ended = false;     ///< the thread's work is done
    std::stop_source m_giveUp;
    std::thread m_thread;
};

#endif
