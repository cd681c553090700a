#include "host/history/PositionTable.h"

#include "host/base/JsonWriter.h"

#include <algorithm>
#include <utility>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

/// An array of device, inode, offset, guard, its length and time of modification for each file;
/// nothing if there are none.
std::string textOf(const LatePositions& late) {
    if (late.files().empty()) {
        return {};
    }
    return JsonWriter::text([&late](JsonWriter& json) {
        json.beginArray();
        for (const LogPosition& file : late.files()) {
            json.beginArray();
            json.value(file.device).value(file.inode).value(file.offset);
            json.value(file.guard).value(file.guardLength).value(file.modified);
            json.endArray();
        }
        json.endArray();
    });
}

/// None if the text is damaged: late lines that were not read yet are lost then.
LatePositions lateFrom(std::string_view text) {
    const nlohmann::json files = nlohmann::json::parse(text, nullptr, false);
    std::vector<LogPosition> late;
    for (const nlohmann::json& file : files.is_array() ? files : nlohmann::json::array()) {
        const bool isNumbers = file.is_array() && file.size() == 6 &&
                               std::all_of(file.begin(), file.end(), [](const auto& number) {
                                   return number.is_number_integer();
                               });
        if (isNumbers) {
            late.push_back({file[0].get<std::uint64_t>(), file[1].get<std::uint64_t>(),
                            file[2].get<std::int64_t>(), file[3].get<std::uint64_t>(),
                            file[4].get<std::uint32_t>(), file[5].get<std::int64_t>()});
        }
    }
    return LatePositions(std::move(late));
}

} // namespace

PositionTable::PositionTable(Database& database)
    : m_keep(database, "INSERT OR REPLACE INTO log_positions"
                       " (log, device, inode, offset, guard, guard_length, noted, modified, cursor,"
                       " late) VALUES (?, ?, ?, ?, ?, ?, ?, ?, ?, ?)"),
      m_remove(database, "DELETE FROM log_positions WHERE noted < ? RETURNING log"),
      m_keepPath(database, "INSERT OR REPLACE INTO watched_paths (path, watched) VALUES (?, ?)"),
      m_removePaths(database, "DELETE FROM watched_paths WHERE watched < ?") {}

void PositionTable::keep(const PositionValue& value, std::int64_t noted) {
    const LogPosition& position = value.position;
    const std::string late = textOf(position.late);
    m_keep.bind(1, std::string_view(value.log))
        .bind(2, position.device)
        .bind(3, position.inode)
        .bind(4, position.offset)
        .bind(5, position.guard)
        .bind(6, std::int64_t{position.guardLength})
        .bind(7, noted)
        .bind(8, position.modified)
        .bind(9, std::string_view(position.cursor))
        .bind(10, std::string_view(late))
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
                             " cursor, late FROM log_positions");
    while (rows.step()) {
        values.logs.push_back({std::string(rows.text(0)),
                               {static_cast<std::uint64_t>(rows.integer(1)),
                                static_cast<std::uint64_t>(rows.integer(2)), rows.integer(3),
                                static_cast<std::uint64_t>(rows.integer(4)),
                                static_cast<std::uint32_t>(rows.integer(5)), rows.integer(6),
                                std::string(rows.text(7)), lateFrom(rows.text(8))}});
    }
    Statement paths(database, "SELECT path, watched FROM watched_paths");
    while (paths.step()) {
        values.paths.push_back({std::string(paths.text(0)), paths.integer(1)});
    }
    return values;
}

} // namespace zrm::host
