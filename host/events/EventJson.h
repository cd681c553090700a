#ifndef ZRM_HOST_EVENT_JSON_H
#define ZRM_HOST_EVENT_JSON_H

#include "host/events/Event.h"
#include "host/events/RowJson.h"
#include "host/framework/RowLayout.h"

#include <cstdint>
#include <string>

namespace zrm::host {

/// Writes events as JSON objects: {"id", "situation", "severity", "raised", "row"}, and for the log
/// of a [[log]] table also {"fields", "entry", "entry_cut", "context"} where there is such a thing.
/// What judges groups and episodes adds {"state", "episode", "count", "group", "reason"}, and the
/// situation {"text", "runbook", "labels"}. An event without a row has {"log", "node"} instead. An
/// event that a silence holds back has its id, {"silenced"}. Immutable, so any thread.
class EventJson {
public:
    explicit EventJson(RowLayout layout);

    /// Appends one event's object, without a newline. `silence`: the one that holds it back; 0:
    /// none.
    void append(std::string& text, const Event& event, std::uint64_t silence = 0) const;

    /// Appends the full path of the event's log, directory and name, as UTF-8. If the UTF-8 columns
    /// are empty, uses the ones in the log's own code page.
    void appendLog(std::string& text, const Event& event) const;

    /// The event's ORIGINNODE.
    std::string node(const Event& event) const;

private:
    static void writeExtras(JsonWriter& json, const Event& event);
    void writeDetail(JsonWriter& json, const EntryDetail& detail) const;
    static void writeJudgement(JsonWriter& json, const Event& event);

    RowLayout m_layout;
    RowJson m_row;
    JsonKey m_situationKey{"situation"};
    JsonKey m_severityKey{"severity"};
    JsonKey m_raisedKey{"raised"};
    JsonKey m_rowKey{"row"};
    JsonKey m_fieldsKey{"fields"};
    JsonKey m_entryKey{"entry"};
    JsonKey m_contextKey{"context"};
};

} // namespace zrm::host

#endif
