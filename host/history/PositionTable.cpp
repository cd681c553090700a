#include "host/history/PositionTable.h"

namespace zrm::host {

PositionTable::PositionTable(Database& database)
    : m_keep(database, "INSERT OR REPLACE INTO log_positions"
                       " (log, device, inode, offset, guard, guard_length, noted, modified, cursor)"
                       " VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?)"),
      m_remove(database, "DELETE FROM log_positions WHERE noted < ? RETURNING log"),
      m_keepPath(database, "INSERT OR REPLACE INTO watched_paths (path, watched) VALUES (?, ?)"),
      m_removePaths(database, "DELETE FROM watched_paths WHERE watched < ?") {}

void PositionTable::keep(const PositionValue& value, std::int64_t noted) {
    const LogPosition& position = value.position;
    m_keep.bind(1, std::string_view(value.log))
        .bind(2, position.device)
        .bind(3, position.inode)
        .bind(4, position.offset)
        .bind(5, position.guard)
        .bind(6, std::int64_t{position.guardLength})
        .bind(7, noted)
        .bind(8, position.modified)
        .bind(9, std::string_view(position.cursor))
        .run();
}

void PositionTable::keep(const WatchedPath& path) {
    m_keepPath.bind(1, std::string_view(path.path)).bind(2, path.watched).run();
}

std::vector<std::string> PositionTable::removeNotedBefore(std::int64_t time) {
    m_removePaths.bind(1, time).run();
    std::vector<std::string> logs;
    m_remove.bind(1, time);
    while (m_remove.step()) {
        logs.emplace_back(m_remove.text(0));
    }
    m_remove.reset();
    return logs;
}

PositionValues PositionTable::read(Database& database) {
    PositionValues values;
    Statement rows(database, "SELECT log, device, inode, offset, guard, guard_length, modified,"
                             " cursor FROM log_positions");
    while (rows.step()) {
        values.logs.push_back({std::string(rows.text(0)),
                               {static_cast<std::uint64_t>(rows.integer(1)),
                                static_cast<std::uint64_t>(rows.integer(2)), rows.integer(3),
                                static_cast<std::uint64_t>(rows.integer(4)),
                                static_cast<std::uint32_t>(rows.integer(5)), rows.integer(6),
                                std::string(rows.text(7))}});
    }
    Statement paths(database, "SELECT path, watched FROM watched_paths");
    while (paths.step()) {
        values.paths.push_back({std::string(paths.text(0)), paths.integer(1)});
    }
    return values;
}

} // namespace zrm::host
