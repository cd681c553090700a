#ifndef ZRM_HOST_WATCHED_PATHS_H
#define ZRM_HOST_WATCHED_PATHS_H

#include <cstdint>
#include <map>
#include <mutex>
#include <string>
#include <vector>

namespace zrm::host {

/// A path or glob of the configuration, and until when it was watched.
struct WatchedPath {
    std::string path; ///< with what is excluded from it, each on a line of its own
    /// Each file that it named at this time had a stored position (milliseconds since 1970).
    std::int64_t watched = 0;

    bool operator==(const WatchedPath&) const = default;
};

/// Until when each path or glob of the configuration was watched. A file of one that has no
/// position and was written to later was not there before. Any thread.
class WatchedPaths {
public:
    /// A stored time is renewed when it is this much older (milliseconds), unless something else is
    /// stored anyway: an older time only makes more files count as new.
    static constexpr std::int64_t storedEvery = 10 * 60'000;

    explicit WatchedPaths(const std::vector<WatchedPath>& stored);

    void note(const std::string& path, std::int64_t time);
    std::map<std::string, std::int64_t> all() const;

    // For the writer of the store.

    /// The paths whose stored time is older by `difference` milliseconds or more, or missing.
    std::vector<WatchedPath> unsaved(std::int64_t difference) const;
    void saved(const std::vector<WatchedPath>& paths);
    /// The store has lost what it had.
    void forgetSaved();

private:
    struct Times {
        std::int64_t watched = 0;
        std::int64_t stored = 0; ///< 0: not stored
    };
    mutable std::mutex m_mutex;
    std::map<std::string, Times> m_paths;
};

} // namespace zrm::host

#endif
