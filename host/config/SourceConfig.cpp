#include "host/config/SourceConfig.h"

#include <algorithm>

namespace zrm::host {

bool isSourceName(std::string_view name) noexcept {
    constexpr std::string_view others = "-_@:";
    return !name.empty() && name.size() <= longestSourceName &&
           std::all_of(name.begin(), name.end(), [&others](char character) {
               return (character >= 'a' && character <= 'z') ||
                      (character >= 'A' && character <= 'Z') ||
                      (character >= '0' && character <= '9') ||
                      others.find(character) != others.npos;
           });
}

} // namespace zrm::host
