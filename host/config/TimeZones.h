#ifndef ZRM_HOST_TIME_ZONES_H
#define ZRM_HOST_TIME_ZONES_H

#include "logs/FollowSettings.h"

#include <string>
#include <vector>

namespace zrm::host {

/// The time zone database of this machine. Stateless; any thread.
namespace TimeZones {

/// The offsets of a zone ("UTC", "Europe/Berlin"), oldest first, at least one. Empty if there is no
/// such zone. Rules end where the database lists no more changes, in 2037.
std::vector<ZoneOffset> offsetsOf(const std::string& name);

} // namespace TimeZones

} // namespace zrm::host

#endif
