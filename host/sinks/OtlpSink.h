#ifndef ZRM_HOST_OTLP_SINK_H
#define ZRM_HOST_OTLP_SINK_H

#include "host/events/Sink.h"
#include "host/sinks/HttpPost.h"

#include <cstddef>
#include <span>
#include <stop_token>
#include <string>

/// Sends events as log records of OpenTelemetry: OTLP over HTTP in its JSON encoding. Records
/// that the receiver takes a request without are told in the trace and not sent again, as the
/// protocol demands.
class OtlpSink : public Sink {
public:
    explicit OtlpSink(const SinkConfig& config);

    std::string name() const override { return m_name; }
    std::size_t deliver(std::span<const EventRecord> events,
                        const std::stop_token& giveUp) override;
    std::string error() const override { return m_http.error(); }

private:
    std::string bodyOf(std::span<const EventRecord> events) const;
    void tellOfRejected(std::size_t sent) const;

    const std::string m_name;
    const std::string m_serviceName;
    const SinkConfig::Texts m_attributes;
    HttpPost m_http;
};

#endif
