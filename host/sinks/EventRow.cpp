#include "host/sinks/EventRow.h"

#include <algorithm>
#include <utility>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = nlohmann::ordered_json;

/// Null if the object has no such member.
const Json& member(const Json& object, const char* name) {
    static const Json nothing;
    const auto found = object.is_object() ? object.find(name) : object.end();
    return found == object.end() ? nothing : *found;
}

std::string textOf(const Json& object, const char* name) {
    const Json& value = member(object, name);
    return value.is_string() ? value.get<std::string>() : std::string();
}

std::uint64_t numberOf(const Json& object, const char* name) {
    const Json& value = member(object, name);
    return value.is_number_unsigned() ? value.get<std::uint64_t>() : 0;
}

std::vector<EventRow::Field> fieldsOf(const Json& object) {
    std::vector<EventRow::Field> fields;
    if (object.is_object()) {
        for (const auto& [name, value] : object.items()) {
            if (value.is_string()) {
                fields.push_back({name, value.get<std::string>()});
            }
        }
    }
    return fields;
}

} // namespace

EventRow::EventRow(const EventRecord& event) {
    const Json json = Json::parse(event.json, nullptr, false);
    const Json& episode = member(json, "episode");
    m_state = textOf(json, "state");
    m_episode = {numberOf(episode, "id"), numberOf(episode, "count"), textOf(episode, "raised"),
                 textOf(episode, "first"), textOf(episode, "last")};
    m_group = fieldsOf(member(json, "group"));
    m_eventText = textOf(json, "text");
    if (isResolved() && !m_eventText.empty()) {
        m_eventText.insert(0, resolvedPrefix);
    }
    m_runbook = textOf(json, "runbook");
    m_labels = fieldsOf(member(json, "labels"));
    const Json* const row = &member(json, "row");
    if (!row->is_object()) {
        m_node = textOf(json, "node");
        describeEpisode(textOf(json, "reason"));
        return;
    }
    m_entry = textOf(json, "entry");
    m_fields = fieldsOf(member(json, "fields"));
    for (const auto& [name, value] : row->items()) {
        if (value.is_string()) {
            m_columns.push_back({name, value.get<std::string>()});
        } else if (value.is_number_integer()) {
            m_columns.push_back({name, value.get<std::int64_t>()});
        }
    }
}

std::string_view EventRow::text(std::string_view column) const {
    const auto found = std::find_if(m_columns.begin(), m_columns.end(),
                                    [&](const Column& known) { return known.name == column; });
    const auto* const text =
        found == m_columns.end() ? nullptr : std::get_if<std::string>(&found->value);
    return text == nullptr ? std::string_view() : *text;
}

void EventRow::describeEpisode(std::string_view reason) {
    m_text = m_state;
    if (!reason.empty()) {
        (m_text += ": ") += reason;
    }
    if (m_episode.count > 0) {
        m_text += "; " + std::to_string(m_episode.count) +
                  (m_episode.count == 1 ? " entry" : " entries") + " from " + m_episode.first +
                  " to " + m_episode.last;
    }
}

std::string_view EventRow::description() const {
    if (m_columns.empty()) {
        return m_text;
    }
    const std::string_view utf8 = text("UENTRYDESC");
    return utf8.empty() ? text("ENTRYDESC") : utf8;
}

std::string_view EventRow::message() const {
    return m_eventText.empty() ? description() : m_eventText;
}

std::string_view EventRow::source() const {
    const std::string_view utf8 = text("UENTRYSRC");
    return utf8.empty() ? text("ENTRYSRC") : utf8;
}

std::string_view EventRow::node() const {
    // The node type follows a colon.
    const std::string_view node = m_columns.empty() ? m_node : text("ORIGINNODE");
    return node.substr(0, node.rfind(':'));
}

} // namespace zrm::host
