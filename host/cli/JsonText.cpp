#include "host/cli/JsonText.h"

#include "host/base/SteeringText.h"

#include <nlohmann/json.hpp>

namespace zrm::host {

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
    return SteeringText::escapedInJson(
        value.dump(onOneLine ? -1 : 2, ' ', false, nlohmann::json::error_handler_t::replace));
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

} // namespace zrm::host
