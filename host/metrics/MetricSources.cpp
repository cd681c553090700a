#include "host/metrics/MetricSources.h"

#include "host/api/EventStream.h"
#include "host/base/TimeText.h"
#include "host/delivery/Delivery.h"
#include "host/history/HistoryReader.h"
#include "host/http/HttpServer.h"
#include "host/http/RequestStatistics.h"
#include "host/metrics/MetricText.h"
#include "host/silences/Silences.h"
#include "host/situations/SituationSet.h"

#include <chrono>
#include <cstdint>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <system_error>
#include <vector>

#include <sys/resource.h>
#include <unistd.h>

namespace zrm::host {

namespace {

double seconds(const timeval& time) {
    constexpr double microseconds = 1e6;
    return static_cast<double>(time.tv_sec) + static_cast<double>(time.tv_usec) / microseconds;
}

void collectTime(MetricText& text) {
    rusage usage{};
    if (getrusage(RUSAGE_SELF, &usage) == 0) {
        text.counter("process_cpu_seconds_total",
                     "Processor time that the agent has used, in seconds.");
        text.add(seconds(usage.ru_utime) + seconds(usage.ru_stime));
    }
}

void collectMemory(MetricText& text) {
    std::ifstream stream("/proc/self/statm");
    std::uint64_t size = 0;
    std::uint64_t resident = 0;
    if (stream >> size >> resident) {
        const auto page = static_cast<std::uint64_t>(sysconf(_SC_PAGESIZE));
        text.gauge("process_virtual_memory_bytes", "Size of the agent's address space.");
        text.add(size * page);
        text.gauge("process_resident_memory_bytes", "Memory of the agent that is resident.");
        text.add(resident * page);
    }
}

void collectDescriptors(MetricText& text) {
    std::error_code error;
    const std::filesystem::directory_iterator descriptors("/proc/self/fd", error);
    if (!error) {
        text.gauge("process_open_fds", "Descriptors that the agent has open.");
        text.add(static_cast<double>(std::distance(begin(descriptors), end(descriptors))));
    }
    rlimit limit{};
    if (getrlimit(RLIMIT_NOFILE, &limit) == 0 && limit.rlim_cur != RLIM_INFINITY) {
        text.gauge("process_max_fds", "Descriptors that the agent may have open.");
        text.add(static_cast<double>(limit.rlim_cur));
    }
}

} // namespace

ProcessMetrics::ProcessMetrics() : m_started(static_cast<double>(WallClock::now()) / 1000) {}

void ProcessMetrics::collect(MetricText& text) {
    text.gauge("zrm_build_info", "The version of the agent, as a label.");
    text.add(1.0, {{"version", ZRM_VERSION}});
    text.gauge("process_start_time_seconds", "When the agent started, in seconds since 1970.");
    text.add(m_started);
    collectTime(text);
    collectMemory(text);
    collectDescriptors(text);
}

void ConfigMetrics::collect(MetricText& text) {
    text.gauge("zrm_config_last_reload_successful",
               "0 when the last change of the configuration file was not loaded, otherwise 1.");
    text.add(m_reload.isTakenOver.load() ? 1.0 : 0.0);
    text.gauge("zrm_config_last_reload_removed_most_situations",
               "1 when the last change of the configuration file that was loaded removed more than "
               "half of its situations, otherwise 0.");
    text.add(m_reload.hasRemovedMost.load() ? 1.0 : 0.0);
}

namespace {

/// A count of a situation.
struct Count {
    const char* name;
    const char* help;
    std::uint64_t SituationStatus::*value;
};

constexpr Count counts[] = {
    {"zrm_situation_offered_total", "Entries that were offered to the situation.",
     &SituationStatus::offered},
    {"zrm_situation_matched_total", "Entries that met every condition of the situation.",
     &SituationStatus::matched},
    {"zrm_situation_discarded_total", "Matching entries that the situation's thresholds rejected.",
     &SituationStatus::discarded},
    {"zrm_situation_raised_total", "Events that the situation raised.", &SituationStatus::raised},
};

/// A name may occur in both sources.
MetricText::Labels labelsOf(const SituationStatus& situation) {
    return {{"situation", situation.config.name},
            {"source", situation.source == SituationStatus::FILE ? "file" : "api"}};
}

} // namespace

void SituationMetrics::collect(MetricText& text) {
    const std::vector<SituationStatus> situations = m_situations.list();
    text.gauge("zrm_situation_running", "1 while the situation is running, otherwise 0.");
    for (const SituationStatus& situation : situations) {
        text.add(situation.state == SituationStatus::RUNNING ? 1.0 : 0.0, labelsOf(situation));
    }
    for (const Count& count : counts) {
        text.counter(count.name, count.help);
        for (const SituationStatus& situation : situations) {
            text.add(situation.*count.value, labelsOf(situation));
        }
    }
    const JudgeCounts judged = m_situations.judgeCounts();
    text.gauge("zrm_episodes_open", "Episodes that last.");
    text.add(static_cast<double>(judged.episodes));
    text.gauge("zrm_groups", "Groups of entries that situations judge apart.");
    text.add(static_cast<double>(judged.groups));
    text.counter("zrm_groups_dropped_total",
                 "Groups that made room for others, since their situations were opened.");
    text.add(judged.droppedGroups);
    constexpr double milliseconds = 1000.0;
    text.gauge("zrm_situation_last_raised_timestamp_seconds",
               "When the situation was last raised, in seconds since 1970.");
    for (const SituationStatus& situation : situations) {
        if (situation.lastRaised != 0) {
            text.add(static_cast<double>(situation.lastRaised) / milliseconds, labelsOf(situation));
        }
    }
}

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

/// Left out when the history cannot be read.
void collectAcknowledged(MetricText& text, HistoryReader& history) {
    if (const Result<std::uint64_t> acknowledged = history.acknowledgedEpisodes()) {
        text.gauge("zrm_episodes_acknowledged", "Open episodes that somebody has acknowledged.");
        text.add(*acknowledged);
    }
}

void collectSilences(MetricText& text, const Silences& silences) {
    text.gauge("zrm_silences_active", "Silences that are active.");
    text.add(std::uint64_t{silences.activeCount(WallClock::now())});
    text.counter("zrm_silenced_events_total", "Events that silences have kept from the sinks.");
    text.add(silences.heldBack());
}

} // namespace

void DeliveryMetrics::collect(MetricText& text) {
    collectQueue(text, m_delivery.queueState());
    collectSinks(text, m_delivery.sinkStates());
    collectSilences(text, m_delivery.silences());
    if (HistoryReader* const history = m_delivery.history()) {
        collectHistory(text, history->state());
        collectAcknowledged(text, *history);
    }
}

void HttpMetrics::collect(MetricText& text) {
    const RequestStatistics& statistics = m_server.statistics();
    text.counter("zrm_http_requests_total", "Requests over HTTP that were answered.");
    for (const auto& [kind, count] : statistics.counts()) {
        text.add(count, {{"method", kind.method.empty() ? "none" : kind.method},
                         {"route", kind.route.empty() ? "none" : kind.route},
                         {"status", std::to_string(kind.status)}});
    }
    text.histogram("zrm_http_request_duration_seconds",
                   "Time that answers took until their body was known, in seconds.");
    for (const auto& [route, durations] : statistics.durations()) {
        text.add(RequestStatistics::limits, durations.upTo, durations.count, durations.seconds,
                 {{"route", route.empty() ? "none" : route}});
    }
    text.gauge("zrm_http_connections", "Connections of clients that are open.");
    text.add(static_cast<double>(m_server.connections()));
    text.counter("zrm_http_refused_connections_total",
                 "Connections that were refused because the limit was reached.");
    text.add(m_server.refusedConnections());
    text.gauge("zrm_http_stream_clients", "Clients that follow the stream of events.");
    text.add(static_cast<double>(m_stream.clients()));
}

} // namespace zrm::host
