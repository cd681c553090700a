#include "host/history/LabelTable.h"

#include <sqlite3.h>

namespace {

bool isKeyOf(std::string_view key, const EventRecord& event) {
    const std::size_t situation = event.situation.size();
    const std::size_t severity = situation + 1 + event.severity.size();
    return key.size() == severity + 1 + event.log.size() && key.starts_with(event.situation) &&
           key.ends_with(event.log) && key[situation] == '\0' && key[severity] == '\0' &&
           key.substr(situation + 1, event.severity.size()) == event.severity;
}

std::int64_t made(Database& database) {
    return sqlite3_last_insert_rowid(database.handle());
}

} // namespace

LabelTable::LabelTable(Database& database)
    : m_database(database), m_findLog(database, "SELECT id FROM logs WHERE path = ?"),
      m_makeLog(database, "INSERT INTO logs (path) VALUES (?)"),
      m_findLabel(database,
                  "SELECT id FROM labels WHERE situation = ? AND severity = ? AND log = ?"),
      m_makeLabel(database, "INSERT INTO labels (situation, severity, log) VALUES (?, ?, ?)") {}

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
    m_findLabel.bind(1, event.situation).bind(2, event.severity).bind(3, label.log);
    if (m_findLabel.step()) {
        label.id = m_findLabel.integer(0);
    } else {
        m_makeLabel.bind(1, event.situation).bind(2, event.severity).bind(3, label.log).run();
        label.id = made(m_database);
    }
    m_findLabel.reset();
    return label;
}

LabelTable::Label LabelTable::of(const EventRecord& event) {
    if (m_last.id != 0 && isKeyOf(m_key, event)) {
        return m_last;
    }
    m_last = {};
    m_key.assign(event.situation).append(1, '\0').append(event.severity).append(1, '\0');
    m_key.append(event.log);
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
