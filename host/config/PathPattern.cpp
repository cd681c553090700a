#include "host/config/PathPattern.h"

#include <fnmatch.h>

namespace zrm::host {

namespace {

/// The place of the ']' that ends the bracket expression after the '[' at `begin`; npos: none.
std::size_t endOfBracket(std::string_view text, std::size_t begin) noexcept {
    constexpr std::string_view classMarks = ":.=";
    std::size_t at = begin + 1;
    at += at < text.size() && (text[at] == '!' || text[at] == '^') ? 1 : 0;
    at += at < text.size() && text[at] == ']' ? 1 : 0; // first, it stands for itself
    while (at < text.size() && text[at] != '/') {
        if (text[at] == ']') {
            return at;
        }
        const bool isClass = text[at] == '[' && at + 1 < text.size() &&
                             classMarks.find(text[at + 1]) != std::string_view::npos;
        if (isClass) {
            const char end[] = {text[at + 1], ']'};
            at = text.find(std::string_view(end, sizeof end), at + 2);
            if (at == std::string_view::npos) {
                return at;
            }
        }
        at += isClass || text[at] == '\\' ? 2 : 1;
    }
    return std::string_view::npos;
}

} // namespace

bool PathPattern::isPattern(std::string_view text) noexcept {
    return text.find_first_of("*?[\\") != std::string_view::npos;
}

std::string PathPattern::literal(std::string_view path) {
    std::string pattern;
    for (const char character : path) {
        const char text[] = {character, '\0'};
        pattern += isPattern(text) ? "\\" : "";
        pattern += character;
    }
    return pattern;
}

bool PathPattern::hasOpenBracket(std::string_view text) noexcept {
    for (std::size_t at = 0; at < text.size(); ++at) {
        if (text[at] == '\\') {
            ++at;
        } else if (text[at] == '[') {
            at = endOfBracket(text, at);
            if (at == std::string_view::npos) {
                return true;
            }
        }
    }
    return false;
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
