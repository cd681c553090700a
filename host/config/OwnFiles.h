#ifndef ZRM_HOST_OWN_FILES_H
#define ZRM_HOST_OWN_FILES_H

#include "host/config/HostConfig.h"

#include <map>
#include <string>

namespace zrm::host {

/// The files that an agent with this configuration writes, by path, and what each is, for messages
/// ("the history"). A log among them would feed itself: each event would add a line.
std::map<std::string, std::string> ownFilesOf(const HostConfig& config);

} // namespace zrm::host

#endif
