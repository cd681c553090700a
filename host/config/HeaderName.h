#ifndef ZRM_HOST_HEADER_NAME_H
#define ZRM_HOST_HEADER_NAME_H

#include <string_view>

namespace zrm::host {

/// True for what may be the name of a header that an operator adds to those that a sink sets.
bool isAddableHeader(std::string_view name);

/// True for the name of a header whose value usually is a secret, such as Authorization.
bool isSecretHeader(std::string_view name);

} // namespace zrm::host

#endif
