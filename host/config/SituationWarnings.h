#ifndef ZRM_HOST_SITUATION_WARNINGS_H
#define ZRM_HOST_SITUATION_WARNINGS_H

#include <string>
#include <vector>

namespace zrm::host {

struct HostConfig;

/// What the author of a configuration's situations may not have meant, one sentence each:
/// conditions on fields of logs whose entries have none, which every entry meets or none, and texts
/// with names in braces that are none. `path` is that of the configuration.
std::vector<std::string> warningsOfSituations(const HostConfig& config, const std::string& path);

} // namespace zrm::host

#endif
