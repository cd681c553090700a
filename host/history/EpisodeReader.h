#ifndef ZRM_HOST_EPISODE_READER_H
#define ZRM_HOST_EPISODE_READER_H

#include "host/events/Episode.h"
#include "host/history/Acknowledgements.h"

#include <cstddef>
#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

class Database;

/// Selects episodes of the history; everything that is set must match.
struct EpisodeFilter {
    std::optional<std::uint64_t> before = std::nullopt; ///< only ids below this one
    std::optional<bool> isOpen = std::nullopt;
    std::vector<std::string> situations = {}; ///< any of these names; empty: all
    std::vector<std::string> logs = {};       ///< any of these full paths; empty: all
    std::vector<GroupValue> group = {};       ///< values that the group has
    std::vector<std::uint64_t> ids = {};      ///< any of these; empty: all
    std::optional<bool> isAcknowledged = std::nullopt;
    std::size_t limit = 100; ///< the most episodes to return
};

/// One episode as returned by the history.
struct EpisodeRecord {
    std::uint64_t id = 0; ///< of the event that raised it
    bool isOpen = true;
    std::string situation;
    std::string severity;
    std::string log;         ///< full path of the log that raised it
    std::string groups;      ///< a JSON object
    std::int64_t raised = 0; ///< milliseconds since 1970, UTC
    std::uint64_t count = 0; ///< entries
    std::int64_t first = 0;  ///< entries' time: seconds since 1970, UTC
    std::int64_t last = 0;
    std::int64_t resolved = 0;        ///< milliseconds since 1970, UTC; 0: it lasts
    std::uint64_t resolvedBy = 0;     ///< id of the event
    Acknowledgement acknowledged;     ///< by nobody if `who` is empty
    std::string reason;               ///< why it was resolved; empty: nothing more has come
    std::vector<EpisodeShare> shares; ///< of each log; without the episode's id
};

/// The episodes of a history. Stateless. Throws DatabaseError.
namespace EpisodeReader {

/// The episodes that pass the filter, the newest first.
std::vector<EpisodeRecord> read(Database& database, const EpisodeFilter& filter);

/// How many of the open episodes somebody has acknowledged.
std::uint64_t countAcknowledged(Database& database);

} // namespace EpisodeReader

} // namespace zrm::host

#endif
