#ifndef ZRM_HOST_ALERTMANAGER_SINK_H
#define ZRM_HOST_ALERTMANAGER_SINK_H

#include "host/sinks/JsonPostSink.h"

#include <chrono>

namespace zrm::host {

class EventRow;
class JsonWriter;

/// Raises an alert in an Alertmanager (API version 2) for each event. An alert ends by itself some
/// time after its event; an event with the same labels before that extends it.
class AlertmanagerSink : public JsonPostSink {
public:
    explicit AlertmanagerSink(const SinkConfig& config);

protected:
    std::string bodyOf(std::span<const EventRecord> events) const override;

private:
    void writeAlert(JsonWriter& json, const EventRecord& event) const;
    void writeLabels(JsonWriter& json, const EventRecord& event, const EventRow& row) const;

    const std::chrono::milliseconds m_resolveAfter;
    const SinkConfig::Texts m_labels;
    const std::string m_generatorUrl;
};

} // namespace zrm::host

#endif
