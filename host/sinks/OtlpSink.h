#ifndef ZRM_HOST_OTLP_SINK_H
#define ZRM_HOST_OTLP_SINK_H

#include "host/sinks/JsonPostSink.h"

namespace zrm::host {

class JsonWriter;

/// Sends events as OpenTelemetry log records: OTLP over HTTP in its JSON encoding. Records that the
/// receiver rejects from an accepted request are traced and not sent again, as the protocol
/// requires.
class OtlpSink : public JsonPostSink {
public:
    explicit OtlpSink(const SinkConfig& config);

protected:
    std::string bodyOf(std::span<const EventRecord> events) const override;
    void taken(std::size_t events, const std::string& answer) const override;

private:
    void writeResource(JsonWriter& json, std::span<const EventRecord> events) const;

    const std::string m_serviceName;
    const SinkConfig::Texts m_attributes;
};

} // namespace zrm::host

#endif
