#ifndef ZRM_HOST_CONFIG_TEXT_H
#define ZRM_HOST_CONFIG_TEXT_H

#include "host/base/Result.h"
#include "host/config/ConfigProblems.h"

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include <toml++/toml.h>

namespace zrm::host {

/// Files in TOML that people write. Stateless.
namespace ConfigText {

/// What a file holds, of at most `most` bytes. It must be a regular file: a pipe could block the
/// reader forever. The problem has no cure.
Result<std::string> read(const std::string& path, std::size_t most);

/// None when a problem was recorded.
std::optional<toml::table> parse(std::string_view text, ConfigProblems& problems);

} // namespace ConfigText

} // namespace zrm::host

#endif
