#include "host/delivery/Delivery.h"

#include "base/TraceScope.h"
#include "host/base/Say.h"
#include "host/events/QueueSource.h"
#include "host/framework/EventRoomControl.h"
#include "host/history/HistoryDirectory.h"
#include "host/sinks/SinkFactory.h"

#include <cinttypes>
#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"Delivery.cpp"};

constexpr std::size_t queuedEvents = 2048; ///< about 6 MB of Log Entries rows

const std::string& directoryOf(const HostConfig& config) {
    return config.history.directory.empty() ? config.stateDirectory : config.history.directory;
}

/// The id after which events are numbered. Without a history that is configured, those that it has
/// reserved are not given again.
std::uint64_t newestId(const HostConfig& config, const History* history) {
    if (history != nullptr) {
        return history->newest();
    }
    return config.history.enabled ? HistoryDirectory::reservedIdsIn(directoryOf(config)) : 0;
}

/// The configured history; null with the reason when it cannot be opened.
std::unique_ptr<History> openHistory(const HostConfig& config, std::string& problem) {
    if (!config.history.enabled) {
        return nullptr;
    }
    auto opened = History::open(config.history, directoryOf(config));
    if (opened) {
        return std::move(*opened);
    }
    problem = opened.error().text();
    say("the history is off: %s. Until the next start sinks receive events without it, and one "
        "that stays down stops the monitoring",
        problem.c_str());
    return nullptr;
}

} // namespace

Delivery::Delivery(const HostConfig& config, const RowLayout& layout, std::size_t rowSize)
    : m_format(layout), m_history(openHistory(config, m_historyProblem)),
      m_queue(queuedEvents, rowSize, newestId(config, m_history.get())) {
    m_queue.onFull(EventRoomControl::setFull);
    for (const SinkConfig& sink : config.sinks) {
        m_sinks.push_back(
            std::make_unique<SinkThread>(source(sink), SinkFactory::make(sink), sink.type));
    }
}

Delivery::~Delivery() {
    EventRoomControl::setFull(false);
    m_sinks.clear();
    if (m_history != nullptr) {
        m_history->finish(EventQueue::Clock::now());
    }
}

std::unique_ptr<EventSource> Delivery::source(const SinkConfig& sink) {
    if (m_history == nullptr) {
        return std::make_unique<QueueSource>(m_queue, m_format);
    }
    return m_history->source(sink.type + ':' + sink.name, sink.name);
}

void Delivery::start() {
    TraceScope trace(anchor);
    if (m_history != nullptr) {
        m_history->start(m_queue, m_format);
    }
    for (const auto& sink : m_sinks) {
        sink->start();
    }
}

void Delivery::finish(EventQueue::Clock::time_point limit) {
    TraceScope trace(anchor);
    if (std::exchange(m_finished, true)) {
        return;
    }
    m_queue.close();
    if (m_history != nullptr) {
        m_history->finish(limit);
    }
    finishSinks(limit);
    if (m_history != nullptr) {
        m_history->storeRest();
    }
}

void Delivery::finishSinks(EventQueue::Clock::time_point limit) {
    const char* const rest =
        m_history == nullptr ? "" : "; it will get them when the agent runs again";
    // First all of them: a sink that hangs until the limit must not take the others' time.
    for (const auto& sink : m_sinks) {
        sink->beginFinish();
    }
    for (const auto& sink : m_sinks) {
        if (const std::uint64_t left = sink->finish(limit); left > 0) {
            say("%" PRIu64 " events were not delivered to %s%s", left, sink->name().c_str(), rest);
        }
    }
}

std::vector<SinkState> Delivery::sinkStates() const {
    std::vector<SinkState> states;
    for (const auto& sink : m_sinks) {
        states.push_back(sink->state());
    }
    return states;
}

} // namespace zrm::host
