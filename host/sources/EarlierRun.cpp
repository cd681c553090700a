#include "host/sources/EarlierRun.h"

#include "host/base/TimeText.h"
#include "host/config/PathPattern.h"
#include "host/events/PositionBook.h"
#include "host/sources/FoundLogs.h"
#include "logs/FurtherLogs.h"
#include "monitor/Generation.h"
#include "monitor/GenerationNames.h"

#include <algorithm>
#include <memory>
#include <set>
#include <string_view>

#include <dirent.h>
#include <fcntl.h>
#include <unistd.h>

namespace zrm::host {

namespace {

/// File systems keep times less exactly than the clock does (milliseconds).
constexpr std::int64_t exactness = 2000;

std::int64_t millisecondsOf(const timespec& time) {
    return static_cast<std::int64_t>(time.tv_sec) * 1000 + time.tv_nsec / 1'000'000;
}

/// Whether somebody can read the file and note a position in it.
bool isReadable(const std::string& path) {
    struct stat status;
    return ::stat(path.c_str(), &status) == 0 && S_ISREG(status.st_mode) &&
           ::faccessat(AT_FDCWD, path.c_str(), R_OK, AT_EACCESS) == 0;
}

/// True if the path or glob of a table names or matches the log.
bool isOf(const std::string& path, const std::string& name) {
    return PathPattern::isPattern(path) ? PathPattern::matches(path, name) : path == name;
}

/// A path and its exclusions, each on a line, as WatchedPath has them.
std::string watchedAs(std::string path, const std::vector<std::string>& excludes) {
    for (const std::string& pattern : excludes) {
        path += '\n' + pattern;
    }
    return path;
}

/// True if one of the exclusions applies to the file.
bool isExcluded(std::string_view watched, const std::string& file) {
    while (watched.find('\n') != std::string_view::npos) {
        watched.remove_prefix(watched.find('\n') + 1);
        if (PathPattern::excludes(std::string(watched.substr(0, watched.find('\n'))), file)) {
            return true;
        }
    }
    return false;
}

/// The first table that names or matches the log.
const LogConfig* tableOf(const std::vector<LogConfig>& logs, const std::string& name) {
    const auto table = std::find_if(logs.begin(), logs.end(), [&name](const LogConfig& log) {
        return std::any_of(log.paths.begin(), log.paths.end(),
                           [&name](const std::string& path) { return isOf(path, name); });
    });
    return table == logs.end() ? nullptr : &*table;
}

/// The inodes of the entries of a directory.
std::set<ino_t> inodesIn(const std::string& directory) {
    std::set<ino_t> inodes;
    const std::unique_ptr<DIR, int (*)(DIR*)> stream(::opendir(directory.c_str()), ::closedir);
    // Only this call uses the stream. NOLINTNEXTLINE(concurrency-mt-unsafe)
    while (const dirent* const entry = stream ? ::readdir(stream.get()) : nullptr) {
        inodes.insert(entry->d_ino);
    }
    return inodes;
}

} // namespace

EarlierRun::EarlierRun(const PositionBook& book, std::set<std::string> monitored)
    : m_watched(book.paths().all()), m_positions(book.positions()),
      m_monitored(std::move(monitored)) {
    for (const auto& [log, position] : m_positions) {
        m_logs.emplace(Identity{position.device, position.inode}, log);
    }
}

void EarlierRun::noteWatched(const PositionBook& book) {
    for (const auto& [path, time] : book.paths().all()) {
        std::int64_t& watched = m_watched[path];
        watched = std::max(watched, time);
    }
}

bool EarlierRun::isNewSince(const std::string& path, const std::string& file,
                            const struct stat& status) const {
    // A path may have been watched with several lists of exclusions.
    auto latest = m_watched.end();
    for (auto one = m_watched.lower_bound(path);
         one != m_watched.end() && one->first.starts_with(path); ++one) {
        const bool isSame = one->first.size() == path.size() || one->first[path.size()] == '\n';
        if (isSame && (latest == m_watched.end() || one->second > latest->second)) {
            latest = one;
        }
    }
    if (latest == m_watched.end() || m_monitored.contains(file) ||
        isExcluded(latest->first, file)) {
        return false;
    }
    // If the clock was set back, the times of files say nothing: rather too much than too little.
    return latest->second > WallClock::now() ||
           millisecondsOf(status.st_mtim) >= latest->second - exactness;
}

std::string EarlierRun::logOf(const std::string& file, const Identity& identity) const {
    const auto [begin, end] = m_logs.equal_range(identity);
    for (auto log = begin; log != end; ++log) {
        const LogPosition& position = m_positions.at(log->second);
        if (log->second == file || position.guardLength == 0) {
            continue;
        }
        Tail tail;
        const std::unique_ptr<Generation> opened = Generation::open(file);
        if (opened && opened->holds(position, tail)) {
            return log->second;
        }
    }
    return "";
}

std::vector<std::string> EarlierRun::renamedLogs(const std::vector<LogConfig>& logs) const {
    std::vector<std::string> renamed;
    std::map<std::string, std::set<ino_t>> directories;
    const auto isIn = [&directories](const std::string& directory, std::uint64_t inode) {
        auto known = directories.find(directory);
        if (known == directories.end()) {
            known = directories.emplace(directory, inodesIn(directory)).first;
        }
        return known->second.contains(static_cast<ino_t>(inode));
    };
    for (const auto& [log, position] : m_positions) {
        struct stat status;
        const LogConfig* const table = tableOf(logs, log);
        if (table == nullptr || ::stat(log.c_str(), &status) == 0) {
            continue;
        }
        const std::string moved = rotationDirectory(log, table->follow.rotatedTo);
        if (isIn(log.substr(0, log.rfind('/') + 1), position.inode) ||
            (!moved.empty() && isIn(moved, position.inode))) {
            renamed.push_back(log);
        }
    }
    return renamed;
}

void EarlierRun::noteLook(PositionBook& book, const std::vector<LogConfig>& logs,
                          const FoundLogs& found, std::int64_t time) {
    for (std::size_t index = 0; index < found.sources.size(); ++index) {
        if (!logs[index].follow.resume) {
            continue;
        }
        std::vector<std::string> unknown;
        for (const std::string& file : found.sources[index].files) {
            if (!book.isStored(file) && !FurtherLogs::isLeftOut(file) && isReadable(file)) {
                unknown.push_back(file);
            }
        }
        for (const std::string& path : logs[index].paths) {
            if (std::none_of(unknown.begin(), unknown.end(),
                             [&path](const std::string& file) { return isOf(path, file); })) {
                book.paths().note(watchedAs(path, logs[index].excludes), time);
            }
        }
    }
}

} // namespace zrm::host
