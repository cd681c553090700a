#ifndef ZRM_HOST_JSON_TOKEN_H
#define ZRM_HOST_JSON_TOKEN_H

#include <cstddef>
#include <string_view>

namespace zrm::host {

/// The pieces of a JSON text.
namespace JsonToken {

inline bool isBlank(char character) noexcept {
    return character == ' ' || character == '\t' || character == '\n' || character == '\r';
}

inline std::string_view withoutBlanksBehind(std::string_view text) noexcept {
    while (!text.empty() && isBlank(text.back())) {
        text.remove_suffix(1);
    }
    return text;
}

/// What is between the quotes of a token, behind which there may be blanks.
inline std::string_view quoted(std::string_view token) noexcept {
    return token.substr(1, token.rfind('"') - 1);
}

inline std::size_t takeDigits(std::string_view& text) noexcept {
    std::size_t count = 0;
    while (count < text.size() && text[count] >= '0' && text[count] <= '9') {
        ++count;
    }
    text.remove_prefix(count);
    return count;
}

inline bool take(std::string_view& text, std::string_view characters) noexcept {
    const bool isThere = !text.empty() && characters.find(text.front()) != characters.npos;
    text.remove_prefix(isThere ? 1 : 0);
    return isThere;
}

/// True for a number as JSON writes it.
inline bool isNumber(std::string_view text) noexcept {
    take(text, "-");
    const bool beginsWithZero = text.starts_with('0');
    const std::size_t digits = takeDigits(text);
    if (digits == 0 || (beginsWithZero && digits > 1) ||
        (take(text, ".") && takeDigits(text) == 0)) {
        return false;
    }
    if (take(text, "eE")) {
        take(text, "+-");
        return takeDigits(text) > 0 && text.empty();
    }
    return text.empty();
}

} // namespace JsonToken

} // namespace zrm::host

#endif
