#include "host/events/EventJson.h"

#include "host/events/RowText.h"

#include <utility>

namespace zrm::host {

EventJson::EventJson(RowLayout layout) : m_layout(std::move(layout)), m_row(m_layout) {}

void EventJson::append(std::string& text, const Event& event) const {
    JsonWriter::append(text, [&](JsonWriter& json) {
        json.beginObject();
        json.member("id", event.id);
        json.key(m_situationKey).value(event.situation->name);
        json.key(m_severityKey).value(event.situation->severity);
        json.key(m_raisedKey).time(event.raised);
        json.key(m_rowKey);
        m_row.write(json, event.row);
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

void EventJson::appendLog(std::string& text, const Event& event) const {
    LogPath::append(text, m_layout, event.row);
}

} // namespace zrm::host
