#include "host/metrics/HttpMetrics.h"

#include "host/api/EventStream.h"
#include "host/http/HttpServer.h"
#include "host/http/RequestStatistics.h"
#include "host/metrics/MetricText.h"

#include <string>

namespace zrm::host {

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
