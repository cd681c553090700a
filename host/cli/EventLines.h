#ifndef ZRM_HOST_EVENT_LINES_H
#define ZRM_HOST_EVENT_LINES_H

#include "host/cli/Table.h"

#include <cstdint>
#include <map>
#include <string>

#include <nlohmann/json.hpp>

namespace zrm::host {

struct Terminal;

/// Events as lines for people. Stateless.
namespace EventLines {

using Json = nlohmann::ordered_json;
/// Episodes as the agent shows them, by id.
using Episodes = std::map<std::uint64_t, Json>;

/// The id of an event's episode; 0 if it has none.
std::uint64_t episodeOf(const Json& event);

/// Whether an episode is open, acknowledged or resolved.
Table::Cell stateOf(const Json& episode);

/// A table with a line for each event.
std::string table(const Json& events, const Terminal& terminal);

/// A table in which the event of an episode stands for the whole of it. Without episodes it is the
/// same as the other.
std::string table(const Json& events, const Episodes& episodes, const Terminal& terminal);

/// One event while following: what comes next is not known, so columns have a width of their own.
/// By episode, the event of one has the episode's id, state and count.
std::string line(const Json& event, const Terminal& terminal, bool isByEpisode);

} // namespace EventLines

} // namespace zrm::host

#endif
