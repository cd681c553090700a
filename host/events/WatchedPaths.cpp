#include "host/events/WatchedPaths.h"

namespace zrm::host {

WatchedPaths::WatchedPaths(const std::vector<WatchedPath>& stored) {
    for (const WatchedPath& path : stored) {
        m_paths.emplace(path.path, Times{path.watched, path.watched});
    }
}

void WatchedPaths::note(const std::string& path, std::int64_t time) {
    const std::lock_guard guard(m_mutex);
    m_paths[path].watched = time;
}

std::map<std::string, std::int64_t> WatchedPaths::all() const {
    std::map<std::string, std::int64_t> paths;
    const std::lock_guard guard(m_mutex);
    for (const auto& [path, times] : m_paths) {
        paths.emplace(path, times.watched);
    }
    return paths;
}

std::vector<WatchedPath> WatchedPaths::unsaved(std::int64_t difference) const {
    std::vector<WatchedPath> paths;
    const std::lock_guard guard(m_mutex);
    for (const auto& [path, times] : m_paths) {
        // A clock that was set back is stored, too.
        const std::int64_t moved = times.watched - times.stored;
        if (moved != 0 && (moved >= difference || moved < 0)) {
            paths.push_back({path, times.watched});
        }
    }
    return paths;
}

void WatchedPaths::saved(const std::vector<WatchedPath>& paths) {
    const std::lock_guard guard(m_mutex);
    for (const WatchedPath& path : paths) {
        m_paths[path.path].stored = path.watched;
    }
}

void WatchedPaths::forgetSaved() {
    const std::lock_guard guard(m_mutex);
    for (auto& [path, times] : m_paths) {
        times.stored = 0;
    }
}

} // namespace zrm::host
