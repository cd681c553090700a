#include "host/history/LabelTable.h"

#include <array>

#include <sqlite3.h>

namespace zrm::host {

namespace {

/// What makes a label, besides the silence.
std::array<std::string_view, 4> partsOf(const EventRecord& event) {
    return {event.situation, event.severity, event.text, event.log};
}

bool isKeyOf(std::string_view key, const EventRecord& event) {
    for (const std::string_view part : partsOf(event)) {
        if (!key.starts_with(part) || key.size() == part.size() || key[part.size()] != '\0') {
            return false;
        }
        key.remove_prefix(part.size() + 1);
    }
    return true;
}

std::int64_t made(Database& database) {
    return sqlite3_last_insert_rowid(database.handle());
}

} // namespace

LabelTable::LabelTable(Database& database)
    : m_database(database), m_findLog(database, "SELECT id FROM logs WHERE path = ?"),
      m_makeLog(database, "INSERT INTO logs (path) VALUES (?)"),
      m_findLabel(database, "SELECT id FROM labels WHERE situation = ? AND severity = ? AND log = ?"
                            " AND text = ? AND silence = ?"),
      m_makeLabel(database, "INSERT INTO labels (situation, severity, log, text, silence)"
                            " VALUES (?, ?, ?, ?, ?)") {}

std::int64_t LabelTable::log(std::string_view path) {
    if (const auto known = m_logs.find(path); known != m_logs.end()) {
        return known->second;
    }
    std::int64_t id = 0;
    if (m_findLog.bind(1, path).step()) {
        id = m_findLog.integer(0);
    } else {
        m_makeLog.bind(1, path).run();
        id = made(m_database);
    }
    m_findLog.reset();
    m_logs.emplace(path, id);
    return id;
}

LabelTable::Label LabelTable::findOrMake(const EventRecord& event) {
    Label label;
    label.log = log(event.log);
    for (Statement* const statement : {&m_findLabel, &m_makeLabel}) {
        statement->bind(1, event.situation).bind(2, event.severity);
        statement->bind(3, label.log).bind(4, event.text).bind(5, event.silence);
    }
    if (m_findLabel.step()) {
        label.id = m_findLabel.integer(0);
    } else {
        m_makeLabel.run();
        label.id = made(m_database);
    }
    m_findLabel.reset();
    return label;
}

LabelTable::Label LabelTable::of(const EventRecord& event) {
    if (m_last.id != 0 && m_lastSilence == event.silence && isKeyOf(m_key, event)) {
        return m_last;
    }
    m_last = {};
    m_key.clear();
    for (const std::string_view part : partsOf(event)) {
        m_key.append(part).append(1, '\0');
    }
    m_key += std::to_string(event.silence);
    m_lastSilence = event.silence;
    const auto known = m_labels.find(m_key);
    m_last = known != m_labels.end() ? known->second
                                     : m_labels.emplace(m_key, findOrMake(event)).first->second;
    return m_last;
}

void LabelTable::forget() {
    m_logs.clear();
    m_labels.clear();
    m_last = {};
}

void LabelTable::removeUnused() {
    m_database.run("DELETE FROM labels WHERE NOT EXISTS"
                   " (SELECT 1 FROM events WHERE events.label = labels.id)");
    m_database.run("DELETE FROM logs WHERE"
                   " NOT EXISTS (SELECT 1 FROM labels WHERE labels.log = logs.id) AND"
                   " NOT EXISTS (SELECT 1 FROM rates WHERE rates.log = logs.id)");
    forget();
}

} // namespace zrm::host
