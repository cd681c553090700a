#include "host/events/SinkThread.h"

#include "agent/TraceScope.h"

#include <algorithm>
#include <utility>

namespace {

TRC1_Anchor anchor{"SinkThread.cpp"};

constexpr std::size_t batch = 64; ///< events per delivery
constexpr std::chrono::milliseconds firstPause{100};
constexpr std::chrono::milliseconds longestPause{30'000};

} // namespace

SinkThread::SinkThread(EventQueue& queue, EventJson format, std::unique_ptr<Sink> sink)
    : m_queue(queue), m_reader(queue.addReader()), m_format(std::move(format)),
      m_sink(std::move(sink)), m_texts(batch), m_logs(batch), m_pause(firstPause) {}

SinkThread::~SinkThread() {
    finish(Clock::now());
}

void SinkThread::start() {
    m_thread = std::thread(&SinkThread::run, this);
}

void SinkThread::run() {
    TraceScope trace(anchor);
    for (;;) {
        const std::span<const Event> events = m_queue.read(m_reader, batch);
        if (events.empty()) {
            break;
        }
        const std::size_t delivered = deliver(events);
        m_queue.release(m_reader, delivered);
        if (delivered < events.size()) {
            if (m_giveUp.stop_requested()) {
                break;
            }
            pause();
        }
    }
    {
        const std::lock_guard guard(m_mutex);
        m_ended = true;
    }
    m_changed.notify_all();
}

std::span<const EventRecord> SinkThread::recordsOf(std::span<const Event> events) {
    m_records.clear();
    for (const Event& event : events) {
        std::string& text = m_texts[m_records.size()];
        std::string& log = m_logs[m_records.size()];
        text.clear();
        m_format.append(text, event);
        log.clear();
        m_format.appendLog(log, event);
        m_records.push_back(
            {event.id, event.raised, event.situation->name, event.situation->severity, log, text});
    }
    return m_records;
}

std::size_t SinkThread::deliver(std::span<const Event> events) {
    const std::size_t delivered = m_sink->deliver(recordsOf(events), m_giveUp.get_token());
    if (delivered < events.size()) {
        failed();
    } else if (m_failing) {
        TraceScope trace(anchor);
        m_failing = false;
        trace.error()("Sink %s takes events again.", name().c_str());
    }
    if (delivered > 0) {
        m_pause = firstPause;
    }
    return delivered;
}

void SinkThread::failed() {
    TraceScope trace(anchor);
    if (!m_failing) {
        trace.error()("Error delivering events to %s: %s. Trying again.", name().c_str(),
                      m_sink->error().c_str());
    } else {
        trace.detail()("Still no delivery to %s: %s.", name().c_str(), m_sink->error().c_str());
    }
    m_failing = true;
}

void SinkThread::pause() {
    std::unique_lock lock(m_mutex);
    const auto wakeUp = [&] { return m_giveUp.stop_requested(); };
    if (m_finishing) {
        m_changed.wait_for(lock, firstPause, wakeUp);
        return;
    }
    m_changed.wait_for(lock, m_pause, [&] { return m_finishing || wakeUp(); });
    m_pause = std::min(2 * m_pause, longestPause);
}

std::size_t SinkThread::finish(Clock::time_point limit) {
    TraceScope trace(anchor);
    if (m_thread.joinable()) {
        m_queue.close();
        {
            std::unique_lock lock(m_mutex);
            m_finishing = true;
            m_changed.notify_all();
            m_changed.wait_until(lock, limit, [&] { return m_ended; });
            m_giveUp.request_stop();
        }
        m_changed.notify_all();
        m_thread.join();
    }
    return trace.result(m_queue.backlog(m_reader));
}
