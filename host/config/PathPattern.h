#ifndef ZRM_HOST_PATH_PATTERN_H
#define ZRM_HOST_PATH_PATTERN_H

#include <string>
#include <string_view>

namespace zrm::host {

/// Globs as a shell has them: '*', '?' and '[...]' match within one name, a backslash takes the
/// next character literally, and a leading dot is matched only by a dot. Stateless; any thread.
namespace PathPattern {

/// Whether the text holds anything but literal characters.
bool isPattern(std::string_view text) noexcept;

/// The pattern that matches only this path.
std::string literal(std::string_view path);

/// Whether a '[' has no ']' in the same name. Such a pattern matches only a literal '['.
bool hasOpenBracket(std::string_view text) noexcept;

/// Whether a pattern matches a whole path.
bool matches(const std::string& pattern, const std::string& path) noexcept;

/// Whether an exclusion applies to an absolute path: as a whole, or, without a '/' in the pattern,
/// by its file name.
bool excludes(const std::string& pattern, const std::string& path) noexcept;

} // namespace PathPattern

} // namespace zrm::host

#endif
