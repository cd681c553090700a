#ifndef ZRM_HOST_HEADER_NAME_H
#define ZRM_HOST_HEADER_NAME_H

#include <string_view>

namespace zrm::host {

/// Whether an operator may add a header of this name to those that a sink sets.
bool isAddableHeader(std::string_view name);

/// Whether the value of this header is usually a secret, as for Authorization.
bool isSecretHeader(std::string_view name);

} // namespace zrm::host

#endif
