#include "host/metrics/DeliveryMetrics.h"

#include "host/delivery/Delivery.h"
#include "host/history/HistoryReader.h"
#include "host/metrics/MetricText.h"

#include <chrono>
#include <vector>

namespace zrm::host {

namespace {

void collectQueue(MetricText& text, const QueueState& queue) {
    text.gauge("zrm_queue_events", "Events that are waiting in the queue.");
    text.add(static_cast<double>(queue.size));
    text.gauge("zrm_queue_capacity_events", "Number of events for which the queue has room.");
    text.add(static_cast<double>(queue.capacity));
    text.counter("zrm_queue_waits_total", "How often a log had to wait for room in the queue.");
    text.add(queue.waits);
    text.counter("zrm_queue_wait_seconds_total",
                 "Time that logs have waited for room in the queue, in seconds.");
    text.add(std::chrono::duration<double>(queue.waited).count());
}

MetricText::Labels labelsOf(const SinkState& sink) {
    return {{"sink", sink.name}, {"type", sink.type}};
}

void collectSinks(MetricText& text, const std::vector<SinkState>& sinks) {
    text.gauge("zrm_sink_up", "0 while deliveries to the sink fail, otherwise 1.");
    for (const SinkState& sink : sinks) {
        text.add(sink.condition == SinkState::Condition::FAILING ? 0.0 : 1.0, labelsOf(sink));
    }
    text.gauge("zrm_sink_lag_events", "Events that have not been delivered to the sink yet.");
    for (const SinkState& sink : sinks) {
        text.add(sink.lag, labelsOf(sink));
    }
    text.counter("zrm_sink_delivered_events_total", "Events that were delivered to the sink.");
    for (const SinkState& sink : sinks) {
        text.add(sink.delivered, labelsOf(sink));
    }
    text.counter("zrm_sink_failures_total", "Deliveries to the sink that failed.");
    for (const SinkState& sink : sinks) {
        text.add(sink.failures, labelsOf(sink));
    }
}

void collectHistory(MetricText& text, const HistoryState& history) {
    text.gauge("zrm_history_up", "0 while the history cannot store events, otherwise 1.");
    text.add(history.problem.empty() ? 1.0 : 0.0);
    text.gauge("zrm_history_events", "Events in the history.");
    text.add(history.events);
    text.gauge("zrm_history_size_bytes", "Size of the history on disk.");
    text.add(history.bytes);
    text.gauge("zrm_history_damaged_events", "Events that readers found damaged since the start.");
    text.add(history.damaged);
    text.gauge("zrm_history_oldest_event_id", "Id of the oldest event in the history.");
    text.add(history.oldest);
    text.gauge("zrm_history_newest_event_id", "Id of the newest event of the history.");
    text.add(history.newest);
}

} // namespace

void DeliveryMetrics::collect(MetricText& text) {
    collectQueue(text, m_delivery.queueState());
    collectSinks(text, m_delivery.sinkStates());
    if (HistoryReader* const history = m_delivery.history()) {
        collectHistory(text, history->state());
    }
}

} // namespace zrm::host
