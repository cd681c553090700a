#include "host/cli/JsonText.h"

#include <nlohmann/json.hpp>

namespace {

constexpr int deepestNesting = 64;

bool isShallow(std::string_view text) {
    int depth = 0;
    bool isInString = false;
    for (std::size_t at = 0; at < text.size() && depth <= deepestNesting; ++at) {
        const char c = text[at];
        if (c == '"') {
            isInString = !isInString;
        } else if (isInString) {
            at += c == '\\' ? 1 : 0;
        } else {
            depth += c == '[' || c == '{' ? 1 : c == ']' || c == '}' ? -1 : 0;
        }
    }
    return depth <= deepestNesting;
}

} // namespace

JsonText::Json JsonText::parse(std::string_view text) {
    return isShallow(text) ? Json::parse(text, nullptr, false) : Json(Json::value_t::discarded);
}

std::string JsonText::dump(const Json& value, bool onOneLine) {
    const std::string text =
        value.dump(onOneLine ? -1 : 2, ' ', false, nlohmann::json::error_handler_t::replace);
    // The library escapes the ASCII controls; the others stand within strings, too.
    std::string result;
    std::size_t from = 0;
    for (std::size_t at = 0; at < text.size(); ++at) {
        const auto byte = static_cast<unsigned char>(text[at]);
        const auto next = static_cast<unsigned char>(at + 1 < text.size() ? text[at + 1] : 0);
        if (byte == 0x7f || (byte == 0xc2 && next < 0xa0)) {
            constexpr const char* digits = "0123456789abcdef";
            const unsigned char code = byte == 0x7f ? byte : next;
            result.append(text, from, at - from);
            result += std::string("\\u00") + digits[code >> 4] + digits[code & 0x0f];
            at += byte == 0x7f ? 0 : 1;
            from = at + 1;
        }
    }
    return result.append(text, from);
}

std::string JsonText::text(const Json& value) {
    if (value.is_null()) {
        return "";
    }
    return value.is_string() ? value.get<std::string>() : dump(value, true);
}

std::string JsonText::text(const Json& object, std::string_view key) {
    return text(member(object, key));
}

std::uint64_t JsonText::number(const Json& object, std::string_view key) {
    const Json& value = member(object, key);
    return value.is_number() ? value.get<std::uint64_t>() : 0;
}

const JsonText::Json& JsonText::member(const Json& object, std::string_view key) {
    static const Json none;
    if (!object.is_object()) {
        return none;
    }
    const auto found = object.find(std::string(key));
    return found == object.end() ? none : *found;
}
