#ifndef ZRM_HOST_EVENT_FILTER_H
#define ZRM_HOST_EVENT_FILTER_H

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

/// Selects events of the history; everything that is set must match.
struct EventFilter {
    std::uint64_t after = 0;                            ///< only ids above this one
    std::optional<std::uint64_t> before = std::nullopt; ///< only ids below this one
    std::optional<std::int64_t> from =
        std::nullopt; ///< raised then or later: milliseconds since 1970, UTC
    std::optional<std::int64_t> to = std::nullopt; ///< raised then or earlier
    std::vector<std::string> situations = {};      ///< any of these names; empty: all
    std::vector<std::string> logs = {};            ///< any of these full paths; empty: all
    std::vector<std::string> severities = {};      ///< any of these; empty: all
    std::string text = {};                         ///< text that EventText must find; empty: all
    std::size_t limit = 100;                       ///< the most events to return
    bool newestFirst = true; ///< true: by descending id; false: by ascending id
};

} // namespace zrm::host

#endif
