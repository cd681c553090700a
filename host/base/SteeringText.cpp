#include "host/base/SteeringText.h"

#include "host/base/Utf8.h"

#include <string_view>
#include <utility>

namespace zrm::host {

namespace {

/// Whether a character that steers may begin with the byte; C0 controls are escaped in every JSON.
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

} // namespace zrm::host
