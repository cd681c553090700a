#ifndef ZRM_HOST_HTTP_METRICS_H
#define ZRM_HOST_HTTP_METRICS_H

#include "host/metrics/MetricSource.h"

namespace zrm::host {

class EventStream;
class HttpServer;

/// Metrics of the server itself: requests, connections, event stream clients.
class HttpMetrics : public MetricSource {
public:
    /// Both must outlive the object.
    HttpMetrics(const HttpServer& server, const EventStream& stream)
        : m_server(server), m_stream(stream) {}

    void collect(MetricText& text) override;

private:
    const HttpServer& m_server;
    const EventStream& m_stream;
};

} // namespace zrm::host

#endif
