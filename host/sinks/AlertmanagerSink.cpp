#include "host/sinks/AlertmanagerSink.h"

#include "host/base/JsonWriter.h"
#include "host/base/SteeringText.h"
#include "host/base/TimeText.h"
#include "host/sinks/EventRow.h"

#include <algorithm>
#include <set>
#include <string>
#include <string_view>

namespace zrm::host {

namespace {

/// How long an episode may last before Alertmanager takes it for resolved.
constexpr std::int64_t longestEpisode = std::int64_t{30} * 24 * 60 * 60 * 1000; // milliseconds

/// Names of labels and annotations have letters, digits and underlines only.
std::string plainName(const char* prefix, std::string_view field) {
    std::string name = prefix + std::string(field);
    std::replace_if(
        name.begin(), name.end(),
        [](char c) { return (c < '0' || c > '9') && (c < 'A' || c > 'Z') && (c < 'a' || c > 'z'); },
        '_');
    return name;
}

/// Fields whose names become the same give one member, of the first.
void writeFields(JsonWriter& json, const char* prefix, std::span<const EventRow::Field> fields) {
    std::set<std::string> names;
    for (const EventRow::Field& field : fields) {
        const auto [name, isNew] = names.insert(plainName(prefix, field.name));
        if (isNew) {
            json.member(*name, field.value);
        }
    }
}

/// A text that was made for the event says by itself where it comes from, if it should.
std::string summaryOf(const EventRecord& event, const EventRow& row) {
    if (!row.eventText().empty()) {
        return row.eventText();
    }
    const std::string_view what = event.text.empty() ? event.situation : event.text;
    return std::string(row.isResolved() ? EventRow::resolvedPrefix : "") + std::string(what) +
           " in " + std::string(event.log);
}

void writeAnnotations(JsonWriter& json, const EventRecord& event, const EventRow& row) {
    json.beginObject().member("summary", summaryOf(event, row));
    json.member("description", row.description());
    if (!row.runbook().empty()) {
        json.member("runbook_url", row.runbook());
    }
    json.member("source", row.source());
    json.member("event", std::to_string(event.id));
    if (!row.entry().empty()) {
        json.member("entry", row.entry());
    }
    if (row.episode().id > 0) {
        json.member("episode", std::to_string(row.episode().id));
        json.member("count", std::to_string(row.episode().count));
        json.member("first", row.episode().first).member("last", row.episode().last);
    }
    writeFields(json, "field_", row.fields());
    json.endObject();
}

} // namespace

AlertmanagerSink::AlertmanagerSink(const SinkConfig& config)
    : JsonPostSink(config, "/api/v2/alerts"), m_resolveAfter(config.duration("resolve_after")),
      m_labels(config.texts("labels")), m_generatorUrl(config.text("generator_url")) {}

std::string AlertmanagerSink::bodyOf(std::span<const EventRecord> events) const {
    return SteeringText::escapedInJson(JsonWriter::text([&](JsonWriter& json) {
        json.beginArray();
        for (const EventRecord& event : events) {
            writeAlert(json, event);
        }
        json.endArray();
    }));
}

void AlertmanagerSink::writeAlert(JsonWriter& json, const EventRecord& event) const {
    const EventRow row(event);
    json.beginObject().key("labels");
    writeLabels(json, event, row);
    json.key("annotations");
    writeAnnotations(json, event, row);
    if (row.isResolved()) {
        json.member("startsAt", row.episode().raised).key("endsAt").time(event.raised);
    } else {
        const bool hasEnd = row.state().empty(); // an episode's end is another event
        json.key("startsAt").time(event.raised);
        json.key("endsAt").time(event.raised + (hasEnd ? m_resolveAfter.count() : longestEpisode));
    }
    if (!m_generatorUrl.empty()) {
        json.member("generatorURL", m_generatorUrl);
    }
    json.endObject();
}

/// The event's labels, then the situation's and the sink's, which have other names. Where both have
/// a label, the situation knows better. Those of a resolved event are those of the raised one: they
/// identify the alert.
void AlertmanagerSink::writeLabels(JsonWriter& json, const EventRecord& event,
                                   const EventRow& row) const {
    json.beginObject().member("alertname", event.situation).member("severity", event.severity);
    json.member("log", event.log).member("node", row.node());
    writeFields(json, "group_", row.group());
    for (const EventRow::Field& label : row.labels()) {
        json.member(label.name, label.value);
    }
    for (const auto& [name, value] : m_labels) {
        const auto isOfThatName = [&name = name](const EventRow::Field& label) {
            return label.name == name;
        };
        if (std::none_of(row.labels().begin(), row.labels().end(), isOfThatName)) {
            json.member(name, value);
        }
    }
    json.endObject();
}

} // namespace zrm::host
