#ifndef ZRM_HOST_ROTATION_ORIGINS_H
#define ZRM_HOST_ROTATION_ORIGINS_H

#include <string>
#include <vector>

namespace zrm::host {

/// The names of the file of which a rotation may have made the one with this path, whose name has a
/// number at its end ("app.log.1") or a date ("app-2026-11-22.log"). Empty if it has neither.
std::vector<std::string> originsOf(const std::string& path);

} // namespace zrm::host

#endif
