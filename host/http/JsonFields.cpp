#include "host/http/JsonFields.h"

#include "host/http/RequestRefused.h"

#include <algorithm>
#include <functional>
#include <limits>
#include <set>
#include <utility>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using nlohmann::json;

constexpr int deepest = 32;

/// A key as part of a location; makes even an empty key visible.
std::string shown(std::string_view key) {
    return key.empty() ? "\"\"" : std::string(key);
}

/// Checks a body while it is parsed: the parser itself accepts any depth, and takes the last of
/// several members with the same name.
class BodyRules {
public:
    bool operator()(int depth, json::parse_event_t event, const json& parsed) {
        if (depth > deepest) {
            throw RequestRefused(400, "the body is nested deeper than 32", "body");
        }
        if (event == json::parse_event_t::object_start) {
            m_keys.emplace_back();
        } else if (event == json::parse_event_t::object_end) {
            m_keys.pop_back();
        } else if (event == json::parse_event_t::key && !m_keys.back().insert(parsed).second) {
            throw RequestRefused(400, "the member appears twice", shown(parsed.get<std::string>()));
        }
        return true;
    }

private:
    std::vector<std::set<std::string>> m_keys; ///< keys of the open objects
};

std::shared_ptr<const json> parse(std::string_view body) {
    json document = json::object();
    if (!body.empty()) {
        constexpr bool throwsErrors = false;
        BodyRules rules;
        document = json::parse(body, std::ref(rules), throwsErrors);
    }
    if (document.is_discarded()) {
        throw RequestRefused(400, "the body is not JSON", "body");
    }
    if (!document.is_object()) {
        throw RequestRefused(400, "write an object", "body");
    }
    return std::make_shared<const json>(std::move(document));
}

bool isText(const json& value) {
    return value.is_string() && value.get_ref<const std::string&>().find('\0') == std::string::npos;
}

/// A whole number; none for any other value. Numbers beyond 64 bits become the largest.
std::optional<std::int64_t> wholeNumber(const json& value) {
    if (value.is_number_unsigned() &&
        value.get<std::uint64_t>() > std::numeric_limits<std::int64_t>::max()) {
        return std::numeric_limits<std::int64_t>::max();
    }
    return value.is_number_integer() ? std::optional(value.get<std::int64_t>()) : std::nullopt;
}

} // namespace

JsonFields::JsonFields(std::string_view body) : JsonFields(parse(body), "") {}

JsonFields::JsonFields(std::shared_ptr<const json> object, std::string prefix)
    : m_object(std::move(object)), m_prefix(std::move(prefix)) {}

JsonFields::JsonFields(JsonFields&& other) noexcept = default;

JsonFields::~JsonFields() = default;

const json* JsonFields::find(std::string_view key) {
    if (std::find(m_known.begin(), m_known.end(), key) == m_known.end()) {
        m_known.emplace_back(key);
    }
    const auto found = m_object->find(key);
    return found == m_object->end() || found->is_null() ? nullptr : &*found;
}

const json& JsonFields::required(std::string_view key) {
    const json* const value = find(key);
    if (value == nullptr) {
        refuse(key, "is missing");
    }
    return *value;
}

bool JsonFields::has(std::string_view key) const {
    const auto found = m_object->find(key);
    return found != m_object->end() && !found->is_null();
}

std::vector<std::string> JsonFields::keys() const {
    std::vector<std::string> keys;
    for (const auto& [key, value] : m_object->items()) {
        keys.push_back(key);
    }
    return keys;
}

std::string JsonFields::text(std::string_view key) {
    const json& value = required(key);
    if (!isText(value)) {
        refuse(key, value.is_string() ? "write a text without NUL characters" : "write a text");
    }
    return value.get<std::string>();
}

std::optional<std::string> JsonFields::optionalText(std::string_view key) {
    return find(key) == nullptr ? std::nullopt : std::optional(text(key));
}

std::int64_t JsonFields::number(std::string_view key, std::int64_t least, std::int64_t most) {
    const std::optional<std::int64_t> value = wholeNumber(required(key));
    if (!value || *value < least || *value > most) {
        refuse(key, "write a whole number from " + std::to_string(least) + " to " +
                        std::to_string(most));
    }
    return *value;
}

std::optional<std::int64_t> JsonFields::optionalNumber(std::string_view key, std::int64_t least,
                                                       std::int64_t most) {
    return find(key) == nullptr ? std::nullopt : std::optional(number(key, least, most));
}

std::vector<std::string> JsonFields::texts(std::string_view key, std::size_t most) {
    std::vector<std::string> texts;
    const json* const list = find(key);
    if (list == nullptr) {
        return texts;
    }
    if (!list->is_array() || list->size() > most) {
        refuse(key, "write a list of at most " + std::to_string(most) + " texts");
    }
    for (const json& value : *list) {
        if (!isText(value)) {
            throw RequestRefused(400, "write a text", place(key, texts.size()));
        }
        texts.push_back(value.get<std::string>());
    }
    return texts;
}

JsonFields JsonFields::object(std::string_view key) {
    const json& value = required(key);
    if (!value.is_object()) {
        refuse(key, "write an object");
    }
    // Shares ownership of the body that contains the object.
    return {std::shared_ptr<const json>(m_object, &value), place(key) + "."};
}

std::optional<JsonFields> JsonFields::optionalObject(std::string_view key) {
    return find(key) == nullptr ? std::nullopt : std::optional<JsonFields>(object(key));
}

const json& JsonFields::value(std::string_view key) {
    static const json* const nothing = new json; // never destroyed: threads outlive main
    const json* const found = find(key);
    return found == nullptr ? *nothing : *found;
}

std::string JsonFields::place(std::string_view key) const {
    return m_prefix + shown(key);
}

std::string JsonFields::place(std::string_view key, std::size_t index) const {
    return place(key) + "[" + std::to_string(index) + "]";
}

void JsonFields::refuse(std::string_view key, const std::string& detail) const {
    throw RequestRefused(400, detail, place(key));
}

void JsonFields::refuse(std::string_view key, Problem problem) const {
    problem.field = place(key);
    throw RequestRefused(400, std::move(problem));
}

void JsonFields::refuseUnknown() const {
    for (const auto& [key, value] : m_object->items()) {
        if (std::find(m_known.begin(), m_known.end(), key) != m_known.end()) {
            continue;
        }
        std::string known;
        for (const std::string& name : m_known) {
            known += (known.empty() ? "" : ", ") + name;
        }
        refuse(key, known.empty() ? "this body takes no members"
                                  : "unknown member; the members are " + known);
    }
}

} // namespace zrm::host
