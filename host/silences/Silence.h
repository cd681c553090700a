#ifndef ZRM_HOST_SILENCE_H
#define ZRM_HOST_SILENCE_H

#include "host/base/Result.h"
#include "host/events/Episode.h"

#include <algorithm>
#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// Which events a silence holds back: those that meet all that is not empty. Each text is a
/// Wildcard.
struct SilenceMatch {
    std::string situation; ///< its name
    std::string log;       ///< the monitored log's full path
    std::string severity;
    std::string node;              ///< of the agent, with or without what follows the colon
    std::vector<GroupValue> group; ///< with a pattern as the value

    /// Every event.
    bool isAll() const noexcept {
        return situation.empty() && log.empty() && severity.empty() && node.empty() &&
               group.empty();
    }
    bool operator==(const SilenceMatch&) const = default;
};

/// Why some events are not delivered for a while. Times are milliseconds since 1970-01-01, UTC.
struct Silence {
    std::uint64_t id = 0; ///< counted from 1
    SilenceMatch match;
    std::int64_t created = 0;
    std::int64_t until = 0;
    std::string who; ///< whoever created it
    std::string why;
    std::optional<std::int64_t> expired = std::nullopt; ///< when somebody ended it early
    std::string expiredBy = {};                         ///< whoever did
    std::uint64_t events = 0;                           ///< how many it has held back
    std::int64_t last = 0;                              ///< when the latest was raised; 0: none

    /// From then on it holds nothing back.
    std::int64_t end() const noexcept { return expired ? std::min(*expired, until) : until; }
    bool isActive(std::int64_t now) const noexcept { return now < end(); }
    bool operator==(const Silence&) const = default;
};

/// A silence as an operator asks for it.
struct SilenceRequest {
    SilenceMatch match;
    bool isAll = false; ///< every event is meant
    std::string until;  ///< a time, or a duration from now
    std::string who;
    std::string why;

    static constexpr std::size_t mostGroups = 16;
    static constexpr std::size_t longestText = 1024; ///< bytes of each text

    /// The silence, without an id, created at `now`. What is wrong is refused with the member of
    /// the request as the field.
    Result<Silence> check(std::int64_t now) const;
};

} // namespace zrm::host

#endif
