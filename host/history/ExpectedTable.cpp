#include "host/history/ExpectedTable.h"

#include <string_view>

namespace zrm::host {

ExpectedTable::ExpectedTable(Database& database)
    : m_forget(database, "DELETE FROM expected_groups WHERE situation = ?"
                         " AND key = CAST(? AS BLOB)"),
      m_keep(database, "INSERT OR REPLACE INTO expected_groups"
                       " (situation, key, definition, seen, since, log, node)"
                       " VALUES (?, CAST(? AS BLOB), ?, ?, ?, ?, ?)"),
      m_watched(database, "INSERT OR REPLACE INTO watched_time (id, milliseconds) VALUES (1, ?)") {}

void ExpectedTable::keep(const ExpectedValues& values) {
    for (const auto& [situation, key] : values.forgotten) {
        m_forget.bind(1, std::string_view(situation)).bind(2, std::string_view(key)).run();
    }
    for (const ExpectedGroup& group : values.groups) {
        m_keep.bind(1, std::string_view(group.situation)).bind(2, std::string_view(group.key));
        m_keep.bind(3, group.definition).bind(4, group.seen).bind(5, group.since);
        m_keep.bind(6, std::string_view(group.log)).bind(7, std::string_view(group.node)).run();
    }
    if (values.watched > 0) {
        m_watched.bind(1, values.watched).run();
    }
}

ExpectedValues ExpectedTable::read(Database& database) {
    ExpectedValues values;
    values.watched = database.number("SELECT milliseconds FROM watched_time");
    Statement rows(database, "SELECT situation, key, definition, seen, since, log, node"
                             " FROM expected_groups");
    while (rows.step()) {
        ExpectedGroup& group = values.groups.emplace_back();
        group.situation = rows.text(0);
        group.key = rows.text(1);
        group.definition = rows.integer(2);
        group.seen = rows.integer(3);
        group.since = rows.integer(4);
        group.log = rows.text(5);
        group.node = rows.text(6);
    }
    return values;
}

} // namespace zrm::host
