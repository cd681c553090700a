#include "host/events/Delivery.h"

#include "agent/TraceScope.h"
#include "host/events/QueueSource.h"
#include "host/sinks/SinkFactory.h"
#include "host/start/Say.h"

#include <cinttypes>

namespace {

TRC1_Anchor anchor{"Delivery.cpp"};

constexpr std::size_t queuedEvents = 2048; ///< about 6 MB of Log Entries rows

} // namespace

Delivery::Delivery(const std::vector<SinkConfig>& sinks, const RowLayout& layout,
                   std::size_t rowSize)
    : m_queue(queuedEvents, rowSize) {
    for (const SinkConfig& sink : sinks) {
        m_sinks.push_back(
            std::make_unique<SinkThread>(std::make_unique<QueueSource>(m_queue, EventJson(layout)),
                                         SinkFactory::make(sink), sink.type));
    }
}

void Delivery::start() {
    TraceScope trace(anchor);
    for (const auto& sink : m_sinks) {
        sink->start();
    }
}

void Delivery::finish(EventQueue::Clock::time_point limit) {
    TraceScope trace(anchor);
    m_queue.close();
    for (const auto& sink : m_sinks) {
        if (const std::uint64_t left = sink->finish(limit); left > 0) {
            say("%" PRIu64 " events were not delivered to %s", left, sink->name().c_str());
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
