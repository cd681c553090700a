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

/// True for a number as JSON writes it.
inline bool isNumber(std::string_view text) noexcept {
    const char* at = text.data();
    const char* const end = at + text.size();
    const auto take = [&](char one, char other) {
        const bool isThere = at != end && (*at == one || *at == other);
        at += isThere ? 1 : 0;
        return isThere;
    };
    const auto takeDigits = [&] {
        const char* const first = at;
        while (at != end && *at >= '0' && *at <= '9') {
            ++at;
        }
        return at - first;
    };
    take('-', '-');
    const bool beginsWithZero = at != end && *at == '0';
    const auto digits = takeDigits();
    if (digits == 0 || (beginsWithZero && digits > 1) || (take('.', '.') && takeDigits() == 0)) {
        return false;
    }
    if (take('e', 'E')) {
        take('+', '-');
        return takeDigits() > 0 && at == end;
    }
    return at == end;
}

} // namespace JsonToken

} // namespace zrm::host

#endif
