#ifndef ZRM_HOST_OTLP_SINK_H
#define ZRM_HOST_OTLP_SINK_H

#include "host/sinks/JsonPostSink.h"

namespace zrm::host {

/// Sends events as log records of OpenTelemetry: OTLP over HTTP in its JSON encoding. Records
/// that the receiver takes a request without are told in the trace and not sent again, as the
/// protocol demands.
class OtlpSink : public JsonPostSink {
public:
    explicit OtlpSink(const SinkConfig& config);

protected:
    std::string bodyOf(std::span<const EventRecord> events) const override;
    void taken(std::size_t events, const std::string& answer) const override;

private:
    const std::string m_serviceName;
    const SinkConfig::Texts m_attributes;
};

} // namespace zrm::host

#endif
