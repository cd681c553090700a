#ifndef ZRM_HOST_HTTP_METRICS_H
#define ZRM_HOST_HTTP_METRICS_H

#include "host/metrics/MetricSource.h"

namespace zrm::host {

class EventStream;
class HttpServer;

/// The server itself: requests, connections, clients of the event stream.
class HttpMetrics : public MetricSource {
public:
    /// Both outlive the object.
    HttpMetrics(const HttpServer& server, const EventStream& stream)
        : m_server(server), m_stream(stream) {}

    void collect(MetricText& text) override;

private:
    const HttpServer& m_server;
    const EventStream& m_stream;
};

} // namespace zrm::host

#endif
