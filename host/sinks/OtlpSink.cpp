#include "host/sinks/OtlpSink.h"

#include "base/TraceScope.h"
#include "host/base/JsonWriter.h"
#include "host/base/SteeringText.h"
#include "host/sinks/EventRow.h"

#include <algorithm>
#include <charconv>
#include <cinttypes>
#include <cstdint>
#include <string_view>
#include <utility>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"OtlpSink.cpp"};

using Json = nlohmann::json;

/// In the JSON encoding, 64-bit integers are strings.
void writeAttribute(JsonWriter& json, std::string_view key, std::int64_t value) {
    json.beginObject().member("key", key).key("value");
    json.beginObject().member("intValue", std::to_string(value)).endObject().endObject();
}

void writeAttribute(JsonWriter& json, std::string_view key, std::string_view value) {
    json.beginObject().member("key", key).key("value");
    json.beginObject().member("stringValue", value).endObject().endObject();
}

void writeAttributes(JsonWriter& json, const EventRecord& event, const EventRow& row) {
    json.beginArray();
    writeAttribute(json, "zrm.id", static_cast<std::int64_t>(event.id));
    writeAttribute(json, "zrm.situation", event.situation);
    writeAttribute(json, "log.file.path", event.log);
    for (const EventRow::Column& column : row.columns()) {
        const std::string key = "zrm.column." + column.name;
        if (const auto* const number = std::get_if<std::int64_t>(&column.value)) {
            writeAttribute(json, key, *number);
        } else if (const auto& text = std::get<std::string>(column.value); !text.empty()) {
            writeAttribute(json, key, text);
        }
    }
    for (const EventRow::Field& field : row.fields()) {
        writeAttribute(json, "zrm.field." + field.name, field.value);
    }
    if (!row.entry().empty()) {
        writeAttribute(json, "zrm.entry", row.entry());
    }
    if (!row.runbook().empty()) {
        writeAttribute(json, "zrm.runbook", row.runbook());
    }
    for (const EventRow::Field& label : row.labels()) {
        writeAttribute(json, "zrm.label." + label.name, label.value);
    }
    for (const EventRow::Field& group : row.group()) {
        writeAttribute(json, "zrm.group." + group.name, group.value);
    }
    if (!row.state().empty()) {
        const EventRow::Episode& episode = row.episode();
        writeAttribute(json, "zrm.state", row.state());
        writeAttribute(json, "zrm.episode.id", static_cast<std::int64_t>(episode.id));
        writeAttribute(json, "zrm.episode.count", static_cast<std::int64_t>(episode.count));
        writeAttribute(json, "zrm.episode.first", episode.first);
        writeAttribute(json, "zrm.episode.last", episode.last);
    }
    json.endArray();
}

void writeRecord(JsonWriter& json, const EventRecord& event, const EventRow& row) {
    const std::string nanoseconds = std::to_string(event.raised) + "000000";
    json.beginObject().member("timeUnixNano", nanoseconds);
    json.member("observedTimeUnixNano", nanoseconds);
    json.member("severityNumber", SeverityCodes::of(event.severity).otel);
    json.member("severityText", event.severity);
    json.key("body").beginObject().member("stringValue", row.message()).endObject();
    json.key("attributes");
    writeAttributes(json, event, row);
    json.endObject();
}

constexpr std::size_t longestRemark = 200; ///< bytes of a receiver's remark shown in a message

/// A count in the JSON encoding, which may be a string or a number; 0 for anything else.
std::uint64_t countOf(const Json& value) {
    if (value.is_number_unsigned()) {
        return value.get<std::uint64_t>();
    }
    std::uint64_t count = 0;
    if (value.is_string()) {
        const auto& text = value.get_ref<const std::string&>();
        std::from_chars(text.data(), text.data() + text.size(), count);
    }
    return count;
}

/// The beginning of a receiver's remark, on one line.
std::string remarkOf(const Json& value) {
    std::string text = value.is_string() ? value.get<std::string>() : std::string();
    text.resize(std::min(text.size(), longestRemark));
    std::replace_if(
        text.begin(), text.end(), [](char c) { return c < ' ' || c > '~'; }, ' ');
    return text;
}

} // namespace

OtlpSink::OtlpSink(const SinkConfig& config)
    : JsonPostSink(config, "/v1/logs"), m_serviceName(config.text("service_name")),
      m_attributes(config.texts("attributes")) {}

std::string OtlpSink::bodyOf(std::span<const EventRecord> events) const {
    return SteeringText::escapedInJson(JsonWriter::text([&](JsonWriter& json) {
        json.beginObject().key("resourceLogs").beginArray().beginObject();
        json.key("resource").beginObject().key("attributes");
        writeResource(json, events);
        json.endObject();
        json.key("scopeLogs").beginArray().beginObject();
        json.key("scope").beginObject().member("name", "zrmagent").endObject();
        json.key("logRecords").beginArray();
        for (const EventRecord& event : events) {
            writeRecord(json, event, EventRow(event));
        }
        json.endArray().endObject().endArray().endObject().endArray().endObject();
    }));
}

/// What the records of a request have in common.
void OtlpSink::writeResource(JsonWriter& json, std::span<const EventRecord> events) const {
    json.beginArray();
    writeAttribute(json, "service.name", m_serviceName);
    if (!events.empty()) {
        writeAttribute(json, "host.name", EventRow(events.front()).node());
    }
    for (const auto& [key, value] : m_attributes) {
        writeAttribute(json, key, value);
    }
    json.endArray();
}

void OtlpSink::taken(std::size_t events, const std::string& text) const {
    TraceScope trace(anchor);
    const Json answer = Json::parse(text, nullptr, false);
    const auto partial = answer.is_object() ? answer.find("partialSuccess") : answer.end();
    if (partial == answer.end() || !partial->is_object()) {
        return;
    }
    const auto rejected = partial->find("rejectedLogRecords");
    const auto message = partial->find("errorMessage");
    const std::uint64_t count = rejected == partial->end() ? 0 : countOf(*rejected);
    const std::string why = message == partial->end() ? std::string() : remarkOf(*message);
    if (count != 0) {
        trace.error()("%s has rejected %" PRIu64 " of %zu events for good: %s", name().c_str(),
                      count, events, why.c_str());
    } else if (!why.empty()) {
        trace.detail()("%s says: %s", name().c_str(), why.c_str());
    }
}

} // namespace zrm::host
