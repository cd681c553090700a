#ifndef ZRM_HOST_EARLIER_RUN_H
#define ZRM_HOST_EARLIER_RUN_H

#include "framework/LogPositions.h"
#include "host/config/LogConfig.h"

#include <cstdint>
#include <map>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include <sys/stat.h>

namespace zrm::host {

struct FoundLogs;
class PositionBook;

/// What the history knows of the files that [[log]] tables name, from before this start, and until
/// when they were watched.
class EarlierRun {
public:
    /// A file's device and inode.
    using Identity = std::pair<dev_t, ino_t>;

    /// Knows nothing: the first run.
    EarlierRun() = default;
    /// `monitored`: the logs of which there are events or entries, also those that were lines of
    /// the log configuration and have no position.
    explicit EarlierRun(const PositionBook& book, std::set<std::string> monitored = {});

    /// Takes over until when paths were watched in this run: a table may have been removed and be
    /// back.
    void noteWatched(const PositionBook& book);
    /// True if the path or glob was watched, and a file of it that has no position and was not
    /// excluded was written to since: it was not there before, or nobody has read it.
    bool isNewSince(const std::string& path, const std::string& file,
                    const struct stat& status) const;
    /// The logs with a stored position, by name.
    const std::map<std::string, LogPosition>& positions() const noexcept { return m_positions; }
    /// The log whose stored position is in this file, recognised by what the file has before it.
    /// Empty if there is none, and for the log of that name itself. Reads the file.
    std::string logOf(const std::string& file, const Identity& identity) const;
    /// The logs of these tables with a stored position in a file that has another name by now.
    /// Reads the directories in which rotation leaves files.
    std::vector<std::string> renamedLogs(const std::vector<LogConfig>& logs) const;

    /// Notes in the book that the files of the tables were looked for at this time (milliseconds
    /// since 1970): each path and glob of which all files have stored positions by now, except
    /// those that cannot be read and those that nobody follows.
    static void noteLook(PositionBook& book, const std::vector<LogConfig>& logs,
                         const FoundLogs& found, std::int64_t time);

private:
    std::map<std::string, std::int64_t> m_watched; ///< until when, as WatchedPath has it
    std::map<std::string, LogPosition> m_positions;
    std::set<std::string> m_monitored;
    std::multimap<Identity, std::string> m_logs; ///< by the file of the position
};

} // namespace zrm::host

#endif
