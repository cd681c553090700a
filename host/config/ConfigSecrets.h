#ifndef ZRM_HOST_CONFIG_SECRETS_H
#define ZRM_HOST_CONFIG_SECRETS_H

#include "host/config/HostConfig.h"

#include <string>

namespace zrm::host {

/// A warning when the configuration read from this file contains a secret of a sink and every user
/// can read the file; otherwise empty.
std::string warningOfSecrets(const HostConfig& config, const std::string& path);

} // namespace zrm::host

#endif
