#include "host/history/Cursors.h"

namespace zrm::host {

CursorTable::CursorTable(Database& database)
    : m_find(database, "SELECT event FROM cursors WHERE sink = ?"),
      m_keep(database, "INSERT INTO cursors (sink, event, used) VALUES (?, ?, ?)"
                       " ON CONFLICT (sink) DO UPDATE SET event = excluded.event,"
                       " used = excluded.used"),
      m_remove(database, "DELETE FROM cursors WHERE used < ?") {}

std::optional<std::uint64_t> CursorTable::find(std::string_view sink) {
    std::optional<std::uint64_t> event;
    if (m_find.bind(1, sink).step()) {
        event = static_cast<std::uint64_t>(m_find.integer(0));
    }
    m_find.reset();
    return event;
}

void CursorTable::keep(std::string_view sink, std::uint64_t event, std::int64_t used) {
    m_keep.bind(1, sink).bind(2, event).bind(3, used).run();
}

void CursorTable::removeUnusedSince(std::int64_t time) {
    m_remove.bind(1, time).run();
}

} // namespace zrm::host
