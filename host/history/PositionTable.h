#ifndef ZRM_HOST_POSITION_TABLE_H
#define ZRM_HOST_POSITION_TABLE_H

#include "host/events/PositionBook.h"
#include "host/history/Statement.h"

#include <cstdint>
#include <string>
#include <vector>

namespace zrm::host {

/// The position of each followed log, as stored in the history, and the paths that were watched.
/// Used by one thread at a time. Throws DatabaseError.
class PositionTable {
public:
    explicit PositionTable(Database& database);

    /// Stores a position, and that the log was followed at this time (milliseconds since 1970).
    void keep(const PositionValue& value, std::int64_t noted);

    void keep(const WatchedPath& path);

    /// Removes the positions of logs that were last followed before this time, and returns their
    /// names. Also removes the paths that were last watched before it.
    std::vector<std::string> removeNotedBefore(std::int64_t time);

    /// All positions and paths.
    static PositionValues read(Database& database);

private:
    Statement m_keep;
    Statement m_remove;
    Statement m_keepPath;
    Statement m_removePaths;
};

} // namespace zrm::host

#endif
