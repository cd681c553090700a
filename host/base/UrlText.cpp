#include "host/base/UrlText.h"

#include "host/base/Utf8.h"

#include <algorithm>
#include <charconv>

namespace zrm::host {

std::optional<std::string> UrlText::decode(std::string_view encoded) {
    std::string text;
    for (std::size_t at = 0; at < encoded.size(); ++at) {
        char c = encoded[at];
        if (c == '%') {
            constexpr int hexadecimal = 16;
            const char* const digits = encoded.data() + at + 1;
            unsigned value = 0;
            if (encoded.size() - at < 3 ||
                std::from_chars(digits, digits + 2, value, hexadecimal).ptr != digits + 2) {
                return std::nullopt;
            }
            c = static_cast<char>(value);
            at += 2;
        }
        text += c;
    }
    const bool isText =
        text.find('\0') == std::string::npos && Utf8::validPrefix(text) == text.size();
    return isText ? std::optional(std::move(text)) : std::nullopt;
}

std::string UrlText::encode(std::string_view text) {
    constexpr std::string_view plain = "ABCDEFGHIJKLMNOPQRSTUVWXYZabcdefghijklmnopqrstuvwxyz"
                                       "0123456789-._~";
    constexpr const char* digits = "0123456789ABCDEF";
    std::string part;
    for (const char c : text) {
        if (plain.find(c) != std::string_view::npos) {
            part += c;
        } else {
            const auto byte = static_cast<unsigned char>(c);
            part += {'%', digits[byte >> 4], digits[byte & 0x0f]};
        }
    }
    return part;
}

std::optional<std::multimap<std::string, std::string>> UrlText::query(std::string_view encoded) {
    std::multimap<std::string, std::string> query;
    while (!encoded.empty()) {
        std::string pair(encoded.substr(0, encoded.find('&')));
        encoded.remove_prefix(std::min(pair.size() + 1, encoded.size()));
        if (pair.empty()) {
            continue;
        }
        std::replace(pair.begin(), pair.end(), '+', ' ');
        const std::size_t equals = std::min(pair.find('='), pair.size());
        std::optional<std::string> name = decode(std::string_view(pair).substr(0, equals));
        std::optional<std::string> value =
            decode(std::string_view(pair).substr(std::min(equals + 1, pair.size())));
        if (!name || !value) {
            return std::nullopt;
        }
        query.emplace(std::move(*name), std::move(*value));
    }
    return query;
}

} // namespace zrm::host
