#ifndef ZRM_HOST_NAMED_TEXT_FORMAT_H
#define ZRM_HOST_NAMED_TEXT_FORMAT_H

#include "host/base/Result.h"

#include <cstddef>
#include <string>

namespace zrm::host {

constexpr std::size_t longestTextFormat = 1022; ///< characters, also with names in it

/// Refuses a format of a text log, which can be used as it is written, if it cannot be used for the
/// log of this path, which is in the place of each "${@}". Problem::what follows on "format".
Result<void> checkNamedTextFormat(const std::string& format, const std::string& path);

} // namespace zrm::host

#endif
