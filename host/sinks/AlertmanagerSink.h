#ifndef ZRM_HOST_ALERTMANAGER_SINK_H
#define ZRM_HOST_ALERTMANAGER_SINK_H

#include "host/events/Sink.h"
#include "host/sinks/HttpPost.h"

#include <chrono>
#include <cstddef>
#include <span>
#include <stop_token>
#include <string>

/// Raises an alert at an Alertmanager (its API of version 2) for each event. An alert ends by
/// itself some time after its event; an event that comes earlier with the same labels extends it.
class AlertmanagerSink : public Sink {
public:
    explicit AlertmanagerSink(const SinkConfig& config);

    std::string name() const override { return m_name; }
    std::size_t deliver(std::span<const EventRecord> events,
                        const std::stop_token& giveUp) override;
    std::string error() const override { return m_http.error(); }

private:
    std::string bodyOf(std::span<const EventRecord> events) const;

    const std::string m_name;
    const std::chrono::milliseconds m_resolveAfter;
    const SinkConfig::Texts m_labels;
    const std::string m_generatorUrl;
    HttpPost m_http;
};

#endif
