#include "host/base/SteeringText.h"

#include "host/base/Utf8.h"

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <string_view>
#include <utility>

namespace zrm::host {

namespace {

/// Whether a steering character may begin with the byte; C0 controls are always escaped in JSON.
bool mayBegin(char c) {
    return c == 0x7f || c == '\xc2' || c == '\xd8' || c == '\xe2';
}

} // namespace

void SteeringText::appendEscape(std::string& text, char32_t character) {
    constexpr const char* digits = "0123456789abcdef";
    text += "\\u";
    for (int shift = 12; shift >= 0; shift -= 4) {
        text += digits[(character >> shift) & 0xf];
    }
}

std::string SteeringText::escapedInJson(std::string document) {
    std::string result;
    std::size_t from = 0;
    for (std::size_t at = 0; at < document.size(); ++at) {
        if (!mayBegin(document[at])) {
            continue;
        }
        const Utf8::Sequence sequence = Utf8::firstSequence(std::string_view(document).substr(at));
        const char32_t character =
            Utf8::character(std::string_view(document).substr(at, sequence.length));
        if (sequence.valid && Utf8::isSteering(character)) {
            result.append(document, from, at - from);
            appendEscape(result, character);
            from = at + sequence.length;
        }
        at += sequence.length - 1;
    }
    return from == 0 ? std::move(document) : result.append(document, from);
}

std::size_t SteeringText::copyVisible(std::string_view text, char* out, std::size_t room) noexcept {
    constexpr std::size_t longestEscape = 6;
    std::size_t size = 0;
    while (!text.empty()) {
        const Utf8::Sequence sequence = Utf8::firstSequence(text);
        const std::string_view bytes = text.substr(0, sequence.length);
        text.remove_prefix(sequence.length);
        // A byte outside any character may be a control in the terminal's code page.
        const char32_t character =
            sequence.valid ? Utf8::character(bytes) : static_cast<unsigned char>(bytes.front());
        if (character == '\n' || character == '\t' || !Utf8::isSteering(character)) {
            if (size + bytes.size() > room) {
                break;
            }
            std::memcpy(out + size, bytes.data(), bytes.size());
            size += bytes.size();
            continue;
        }
        char escape[longestEscape + 1];
        const auto length = static_cast<std::size_t>(std::snprintf(
            escape, sizeof escape, character < 0x80 || !sequence.valid ? "\\x%02x" : "\\u%04x",
            static_cast<unsigned>(character)));
        if (size + length > room) {
            break;
        }
        std::memcpy(out + size, escape, length);
        size += length;
    }
    return size;
}

} // namespace zrm::host
