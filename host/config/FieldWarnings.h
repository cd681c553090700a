#ifndef ZRM_HOST_FIELD_WARNINGS_H
#define ZRM_HOST_FIELD_WARNINGS_H

#include <string>
#include <vector>

namespace zrm::host {

struct HostConfig;

/// The situations with conditions on fields of logs whose entries have none, one sentence each:
/// such a condition is met by every entry or by none. `path` is that of the configuration.
std::vector<std::string> warningsOfFields(const HostConfig& config, const std::string& path);

} // namespace zrm::host

#endif
