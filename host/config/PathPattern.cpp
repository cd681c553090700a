#include "host/config/PathPattern.h"

#include <fnmatch.h>

namespace zrm::host {

bool PathPattern::isPattern(std::string_view text) noexcept {
    return text.find_first_of("*?[\\") != std::string_view::npos;
}

bool PathPattern::matches(const std::string& pattern, const std::string& path) noexcept {
    return ::fnmatch(pattern.c_str(), path.c_str(), FNM_PATHNAME | FNM_PERIOD) == 0;
}

bool PathPattern::excludes(const std::string& pattern, const std::string& path) noexcept {
    if (pattern.find('/') != std::string::npos) {
        return matches(pattern, path);
    }
    // An exclusion of names means hidden ones, too.
    return ::fnmatch(pattern.c_str(), path.c_str() + path.rfind('/') + 1, 0) == 0;
}

} // namespace zrm::host
