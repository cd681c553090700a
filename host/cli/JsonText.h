#ifndef ZRM_HOST_JSON_TEXT_H
#define ZRM_HOST_JSON_TEXT_H

#include <cstdint>
#include <string>
#include <string_view>

#include <nlohmann/json_fwd.hpp>

namespace zrm::host {

/// JSON of the agent, read without surprise and written without harm. Stateless.
class JsonText {
public:
    using Json = nlohmann::ordered_json;

    /// Reads a text; a discarded value when it is not JSON, or is nested more deeply than anything
    /// that the agent says: writing such a value takes stack with each level.
    static Json parse(std::string_view text);

    /// JSON text in which no character could steer a terminal; on one line or over several.
    static std::string dump(const Json& value, bool onOneLine);

    /// The member as a text for people: empty when it is missing or null, JSON for what is no
    /// plain value.
    static std::string text(const Json& object, std::string_view key);
    /// The value itself likewise.
    static std::string text(const Json& value);

    /// The member as a number; 0 when it is none.
    static std::uint64_t number(const Json& object, std::string_view key);
    /// The member; a null value when there is none.
    static const Json& member(const Json& object, std::string_view key);
};

} // namespace zrm::host

#endif
