#include "host/sources/RotationOrigins.h"

#include <cstddef>
#include <optional>
#include <string_view>

namespace zrm::host {

namespace {

bool isDigit(char character) {
    return character >= '0' && character <= '9';
}

bool isSeparator(char character) {
    return character == '.' || character == '-' || character == '_';
}

/// What a rotation has put into a name: a number at its end ("app.log.1"), or a date
/// ("app.log-20261122", "app-2026-11-22.log").
struct RotationMark {
    std::size_t begin; ///< of its separator
    std::size_t end;
};

/// The mark that begins at this separator, if there is one.
std::optional<RotationMark> markAt(std::string_view name, std::size_t begin) {
    constexpr std::size_t digitsOfDate = 6;
    std::size_t digits = 0;
    std::size_t end = begin + 1;
    for (; end < name.size(); ++end) {
        const bool isWithin = isDigit(name[end]);
        digits += isWithin ? 1 : 0;
        if (!isWithin && (name[end] == '.' || end == begin + 1 || end + 1 == name.size() ||
                          !isDigit(name[end + 1]))) {
            break;
        }
    }
    const bool isNumber = name[begin] == '.' && end == name.size() && digits > 0;
    const bool isDate = digits >= digitsOfDate && (end == name.size() || name[end] == '.');
    return isNumber || isDate ? std::optional(RotationMark{begin, end}) : std::nullopt;
}

} // namespace

std::vector<std::string> originsOf(const std::string& path) {
    std::vector<std::string> origins;
    for (std::size_t at = path.rfind('/') + 2; at < path.size(); ++at) {
        if (!isSeparator(path[at])) {
            continue;
        }
        if (const std::optional<RotationMark> mark = markAt(path, at)) {
            origins.push_back(path.substr(0, mark->begin) + path.substr(mark->end));
        }
    }
    return origins;
}

} // namespace zrm::host
