#include "host/delivery/SinkThread.h"

#include "base/TraceScope.h"

#include <algorithm>
#include <exception>
#include <iterator>
#include <optional>
#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"SinkThread.cpp"};

constexpr std::size_t batch = 256;            ///< events per delivery
constexpr std::chrono::seconds stallLimit{5}; ///< a longer wait is reported
constexpr std::chrono::seconds givingUpTime{1};
constexpr std::chrono::milliseconds firstPause{100};
constexpr std::chrono::milliseconds longestPause{30'000};

} // namespace

SinkThread::SinkThread(std::unique_ptr<EventSource> source, std::unique_ptr<Sink> sink,
                       std::string type)
    : m_source(std::move(source)), m_sink(std::move(sink)), m_type(std::move(type)),
      m_pause(firstPause, longestPause) {}

SinkThread::~SinkThread() {
    finish(Clock::now());
    if (m_thread.joinable()) {
        m_thread.join();
    }
}

void SinkThread::start() {
    m_ended = false;
    m_thread = std::thread(&SinkThread::run, this);
}

void SinkThread::run() {
    TraceScope trace(anchor);
    while (!m_giveUp.stop_requested()) {
        const std::span<const EventRecord> events = m_source->read(batch);
        if (events.empty()) {
            break;
        }
        const std::size_t delivered = deliverAudible(events);
        m_source->release(delivered);
        if (delivered < events.size() && !m_giveUp.stop_requested()) {
            pause();
        }
    }
    {
        const std::lock_guard guard(m_mutex);
        m_ended = true;
    }
    m_changed.notify_all();
}

/// A sink that throws, for lack of memory or of a thread, has failed like any other.
std::size_t SinkThread::offer(std::span<const EventRecord> events) {
    m_exception.clear();
    try {
        return m_sink->deliver(events, m_giveUp.get_token());
    } catch (const std::exception& exception) {
        m_exception = exception.what();
        return 0;
    }
}

/// Passes over what is silenced. Returns how many of the events are done with.
std::size_t SinkThread::deliverAudible(std::span<const EventRecord> events) {
    const auto isSilenced = [](const EventRecord& event) { return event.silence != 0; };
    if (std::none_of(events.begin(), events.end(), isSilenced)) {
        return deliver(events);
    }
    m_audible.clear();
    std::remove_copy_if(events.begin(), events.end(), std::back_inserter(m_audible), isSilenced);
    const std::size_t delivered = m_audible.empty() ? 0 : deliver(m_audible);
    if (delivered == m_audible.size()) {
        return events.size();
    }
    const std::uint64_t next = m_audible[delivered].id;
    const auto end = std::find_if(events.begin(), events.end(),
                                  [next](const EventRecord& event) { return event.id == next; });
    return static_cast<std::size_t>(end - events.begin());
}

std::size_t SinkThread::deliver(std::span<const EventRecord> events) {
    const std::size_t delivered = offer(events);
    const bool failed = delivered < events.size();
    if (failed && m_giveUp.stop_requested()) {
        // No retry: the caller of finish reports what is left.
    } else if (failed) {
        tellOfFailure();
    } else if (m_state.condition == SinkState::Condition::FAILING) {
        TraceScope trace(anchor);
        trace.error()("Sink %s takes events again.", name().c_str());
    }
    if (delivered > 0) {
        m_pause.reset();
    }
    note(delivered, failed);
    return delivered;
}

void SinkThread::note(std::size_t delivered, bool failed) {
    const std::lock_guard guard(m_mutex);
    m_state.delivered += delivered;
    m_state.failures += failed ? 1 : 0;
    m_state.condition = failed ? SinkState::Condition::FAILING : SinkState::Condition::UP;
    m_state.error = failed ? error() : std::string();
}

void SinkThread::tellOfFailure() {
    TraceScope trace(anchor);
    if (m_state.condition != SinkState::Condition::FAILING) {
        trace.error()("Error delivering events to %s: %s. Trying again.", name().c_str(),
                      error().c_str());
    } else {
        trace.detail()("Still no delivery to %s: %s.", name().c_str(), error().c_str());
    }
}

void SinkThread::pause() {
    std::unique_lock lock(m_mutex);
    const auto wakeUp = [&] { return m_giveUp.stop_requested(); };
    if (m_finishing) {
        m_changed.wait_for(lock, firstPause, wakeUp);
        return;
    }
    m_nextTry = Clock::now() + m_pause.next();
    m_changed.wait_until(lock, m_nextTry, [&] { return m_finishing || wakeUp(); });
    m_nextTry = {};
}

void SinkThread::beginFinish() {
    if (m_thread.joinable()) {
        m_source->end();
        const std::lock_guard guard(m_mutex);
        m_finishing = true;
    }
    m_changed.notify_all();
}

std::uint64_t SinkThread::finish(Clock::time_point limit) {
    TraceScope trace(anchor);
    beginFinish();
    if (m_thread.joinable()) {
        {
            std::unique_lock lock(m_mutex);
            m_changed.wait_until(lock, limit, [&] { return m_ended; });
        }
        m_giveUp.request_stop();
        m_changed.notify_all();
        std::unique_lock lock(m_mutex);
        if (m_changed.wait_until(lock, std::max(limit, Clock::now()) + givingUpTime,
                                 [&] { return m_ended; })) {
            lock.unlock();
            m_thread.join();
        }
    }
    return trace.result(m_source->backlog());
}

/// A waiting delivery has not failed yet, but nothing arrives.
void SinkThread::noteStall(SinkState& state) const {
    const std::optional<Clock::time_point> since = m_sink->waitsSince();
    const auto waited = since ? Clock::now() - *since : Clock::duration::zero();
    if (waited >= stallLimit) {
        state.condition = SinkState::Condition::FAILING;
        state.error = "the reader has taken nothing for " +
                      std::to_string(std::chrono::floor<std::chrono::seconds>(waited).count()) +
                      " s";
    }
}

SinkState SinkThread::state() const {
    std::unique_lock lock(m_mutex);
    SinkState state = m_state;
    const Clock::time_point nextTry = m_nextTry;
    lock.unlock();
    if (nextTry != Clock::time_point{}) {
        const auto left = std::chrono::ceil<std::chrono::milliseconds>(nextTry - Clock::now());
        state.retryIn = std::max(left, std::chrono::milliseconds{0});
    }
    noteStall(state);
    state.name = name();
    state.type = m_type;
    state.lag = m_source->backlog();
    return state;
}

} // namespace zrm::host
