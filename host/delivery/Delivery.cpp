#include "host/delivery/Delivery.h"

#include "base/TraceScope.h"
#include "host/base/Say.h"
#include "host/delivery/QueueSource.h"
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

} // namespace

OpenedHistory openHistory(const HostConfig& config) {
    OpenedHistory result;
    if (config.history.enabled) {
        auto opened = History::open(config.history, directoryOf(config));
        if (opened) {
            result.history = std::move(*opened);
        } else {
            result.problem = opened.error().text();
            say("the history is off: %s. Until the next start sinks receive events without it, and "
                "one that stays down stops the monitoring",
                result.problem.c_str());
        }
    }
    PositionBook::makeCurrent(result.history == nullptr ? PositionBook::unkept()
                                                        : result.history->positions());
    return result;
}

Delivery::Delivery(const HostConfig& config, const RowLayout& layout, std::size_t rowSize,
                   OpenedHistory&& opened)
    : m_format(layout), m_historyProblem(std::move(opened.problem)),
      m_history(std::move(opened.history)),
      m_queue(queuedEvents, rowSize, newestId(config, m_history.get())),
      m_positions(PositionBook::current()) {
    m_positions->setQueue(&m_queue);
    m_queue.onFull(EventRoomControl::setFull);
    for (const SinkConfig& sink : config.sinks) {
        m_sinks.push_back(
            std::make_unique<SinkThread>(source(sink), SinkFactory::make(sink), sink.type));
    }
}

Delivery::~Delivery() {
    m_positions->setQueue(nullptr);
    EventRoomControl::setFull(false);
    m_sinks.clear();
    if (m_history != nullptr) {
        m_history->finish(EventQueue::Clock::now());
    }
}

std::unique_ptr<EventSource> Delivery::source(const SinkConfig& sink) {
    if (m_history == nullptr) {
        return std::make_unique<QueueSource>(m_queue, m_format, m_unkeptSilences, m_sinks.empty());
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
