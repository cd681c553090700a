#ifndef ZRM_HOST_TOML_TEXT_H
#define ZRM_HOST_TOML_TEXT_H

#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

struct FormatDescription;

/// TOML for people to copy into a configuration.
namespace TomlText {

/// A string with its quotes.
std::string quoted(std::string_view text);

/// The [[log]] table of a log that is read by these ready formats; none: of a syslog file.
std::string logTable(std::string_view log, const std::vector<std::string>& formats);
/// The same by a format of type "regex".
std::string logTable(std::string_view log, const FormatDescription& format);

} // namespace TomlText

} // namespace zrm::host

#endif
