#include "host/events/EventJson.h"

#include "host/events/Episode.h"
#include "host/events/RowText.h"

#include <utility>

namespace zrm::host {

EventJson::EventJson(RowLayout layout) : m_layout(std::move(layout)), m_row(m_layout) {}

void EventJson::append(std::string& text, const Event& event, std::uint64_t silence) const {
    JsonWriter::append(text, [&](JsonWriter& json) {
        json.beginObject();
        json.member("id", event.id);
        json.key(m_situationKey).value(event.situation->name);
        json.key(m_severityKey).value(event.situation->severity);
        json.key(m_raisedKey).time(event.raised);
        writeExtras(json, event);
        if (silence != 0) {
            json.member("silenced", silence);
        }
        if (event.judgement != nullptr) {
            writeJudgement(json, event);
        }
        if (event.row != nullptr) {
            json.key(m_rowKey);
            m_row.write(json, event.row);
        }
        if (event.detail != nullptr) {
            writeDetail(json, *event.detail);
        }
        json.endObject();
    });
}

void EventJson::writeDetail(JsonWriter& json, const EntryDetail& detail) const {
    if (!detail.fields.empty()) {
        json.key(m_fieldsKey).raw(detail.fields);
    }
    if (!detail.text.empty()) {
        json.key(m_entryKey).raw(detail.text);
    }
    if (detail.isCut) {
        json.member("entry_cut", true);
    }
    if (!detail.context.empty()) {
        json.key(m_contextKey).raw(detail.context);
    }
}

/// What the situation adds for people and receivers.
void EventJson::writeExtras(JsonWriter& json, const Event& event) {
    if (event.judgement != nullptr && !event.judgement->text.empty()) {
        json.member("text", event.judgement->text);
    }
    if (!event.situation->runbook.empty()) {
        json.member("runbook", event.situation->runbook);
    }
    if (!event.situation->labels.empty()) {
        json.key("labels").raw(event.situation->labels);
    }
}

void EventJson::writeJudgement(JsonWriter& json, const Event& event) {
    constexpr std::int64_t milliseconds = 1000; // in a second
    const EventJudgement& judgement = *event.judgement;
    const bool isResolved = judgement.state == EventJudgement::RESOLVED;
    if (judgement.episode != nullptr) {
        json.member("state", isResolved ? "resolved" : "raised");
        json.key("episode").beginObject().member("id", judgement.episode->value());
        json.key("raised").time(isResolved ? judgement.episode->raised() : event.raised);
        json.member("count", judgement.count);
        json.key("first").time(judgement.first * milliseconds);
        json.key("last").time(judgement.last * milliseconds).endObject();
    } else if (judgement.count > 0) {
        json.member("count", judgement.count);
    }
    if (!judgement.group.empty()) {
        json.key("group").beginObject();
        for (const GroupValue& group : judgement.group) {
            json.member(group.name, group.value);
        }
        json.endObject();
    }
    if (!judgement.reason.empty()) {
        json.member("reason", judgement.reason);
    }
    if (event.row == nullptr) {
        json.member("log", judgement.log).member("node", judgement.node);
    }
}

std::string EventJson::node(const Event& event) const {
    if (event.row == nullptr) {
        return event.judgement->node;
    }
    std::string room;
    const RowColumn* const column = m_layout.find("ORIGINNODE");
    return column == nullptr ? std::string() : std::string(RowText::of(*column, event.row, room));
}

void EventJson::appendLog(std::string& text, const Event& event) const {
    if (event.row == nullptr) {
        text += event.judgement->log;
    } else {
        LogPath::append(text, m_layout, event.row);
    }
}

} // namespace zrm::host
