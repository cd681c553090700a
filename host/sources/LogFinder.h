#ifndef ZRM_HOST_LOG_FINDER_H
#define ZRM_HOST_LOG_FINDER_H

#include "host/config/LogConfig.h"
#include "host/sources/EarlierRun.h"
#include "host/sources/FoundLogs.h"

#include <chrono>
#include <cstdint>
#include <map>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <utility>
#include <vector>

#include <sys/stat.h>

namespace zrm::host {

/// Finds the files of [[log]] tables, again and again. Remembers the files that it found, so that a
/// file that appears later, one that was rotated, and one that is gone for a moment are known as
/// such. Used by one thread at a time.
class LogFinder {
public:
    using Clock = std::chrono::steady_clock;
    static constexpr std::size_t mostFiles = 10'000;
    /// How long a file that a glob no longer matches stays in the list, so that its log survives a
    /// rotation that creates the new file late.
    static constexpr std::chrono::seconds keptAbsent{60};

    /// `earlier`: what is known from before the first look.
    explicit LogFinder(EarlierRun earlier = {}) : m_earlier(std::move(earlier)) {}

    /// Looks once. `ownFiles`: the files that the agent writes, by path, and what each is.
    FoundLogs look(const std::vector<LogConfig>& logs,
                   const std::map<std::string, std::string>& ownFiles, Clock::time_point now);

private:
    using Identity = EarlierRun::Identity;
    struct Known {
        std::optional<Identity> identity; ///< when it was last there
        Clock::time_point seen;
        bool isNewcomer;
    };
    /// A file that was followed under another name before.
    struct Rotated {
        Identity identity;
        std::string former;
    };
    struct Candidate;
    class Look;

    std::map<std::string, Known> m_known;     ///< the followed files by name
    std::map<std::string, Rotated> m_rotated; ///< by the present name
    /// Passed over by the last look, each with its log.
    std::set<std::pair<Identity, std::string>> m_generations;
    /// Matched by the last look, and excluded or written by the agent: once these are followed,
    /// they are not new.
    std::set<std::string> m_leftOut;
    /// The paths and globs of the last look: a file that one of these matches now is new.
    std::set<std::string> m_searched;
    EarlierRun m_earlier;
    bool m_hasLooked = false;
};

} // namespace zrm::host

#endif
