#include "host/sinks/AlertmanagerSink.h"

#include "host/base/SteeringText.h"
#include "host/base/TimeText.h"
#include "host/sinks/EventRow.h"

#include <string_view>
#include <utility>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = nlohmann::ordered_json;

Json annotationsOf(const EventRecord& event, const EventRow& row) {
    const std::string_view what = event.text.empty() ? event.situation : event.text;
    return {{"summary", std::string(what) + " in " + std::string(event.log)},
            {"description", row.description()},
            {"source", row.source()},
            {"event", std::to_string(event.id)}};
}

} // namespace

AlertmanagerSink::AlertmanagerSink(const SinkConfig& config)
    : JsonPostSink(config, "/api/v2/alerts"), m_resolveAfter(config.duration("resolve_after")),
      m_labels(config.texts("labels")), m_generatorUrl(config.text("generator_url")) {}

std::string AlertmanagerSink::bodyOf(std::span<const EventRecord> events) const {
    Json alerts = Json::array();
    for (const EventRecord& event : events) {
        const EventRow row(event);
        Json labels = {{"alertname", event.situation},
                       {"severity", event.severity},
                       {"log", event.log},
                       {"node", row.node()}};
        labels.update(m_labels);
        Json alert = {{"labels", std::move(labels)},
                      {"annotations", annotationsOf(event, row)},
                      {"startsAt", UtcTime::text(event.raised)},
                      {"endsAt", UtcTime::text(event.raised + m_resolveAfter.count())}};
        if (!m_generatorUrl.empty()) {
            alert["generatorURL"] = m_generatorUrl;
        }
        alerts.push_back(std::move(alert));
    }
    return SteeringText::escapedInJson(alerts.dump(-1, ' ', false, Json::error_handler_t::replace));
}

} // namespace zrm::host
