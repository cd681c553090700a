#ifndef ZRM_HOST_EVENT_FILTER_H
#define ZRM_HOST_EVENT_FILTER_H

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

/// Which events of the history a reader wants; everything that is set must hold.
struct EventFilter {
    std::uint64_t after = 0;                            ///< only ids above this one
    std::optional<std::uint64_t> before = std::nullopt; ///< only ids below this one
    std::optional<std::int64_t> from =
        std::nullopt; ///< raised then or later: milliseconds since 1970, UTC
    std::optional<std::int64_t> to = std::nullopt; ///< raised then or earlier
    std::vector<std::string> situations = {};      ///< any of these names; empty: whichever
    std::vector<std::string> logs = {};            ///< any of these whole paths; empty: whichever
    std::vector<std::string> severities = {};      ///< any of these; empty: whichever
    std::string text = {};                         ///< EventText finds it; empty: whichever
    std::size_t limit = 100;                       ///< at most so many events
    bool newestFirst = true;                       ///< by descending id, else by ascending id
};

} // namespace zrm::host

#endif
