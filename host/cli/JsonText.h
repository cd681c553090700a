#ifndef ZRM_HOST_JSON_TEXT_H
#define ZRM_HOST_JSON_TEXT_H

#include <cstdint>
#include <string>
#include <string_view>

#include <nlohmann/json_fwd.hpp>

namespace zrm::host {

/// Reads JSON from the agent and writes it safely for a terminal. Stateless.
class JsonText {
public:
    using Json = nlohmann::ordered_json;

    /// Parses a text. Returns a discarded value when it is not JSON, or is nested more deeply than
    /// anything that the agent sends: writing such a value takes stack for each level.
    static Json parse(std::string_view text);

    /// JSON text without characters that control a terminal, on one line or several.
    static std::string dump(const Json& value, bool onOneLine);

    /// The member as text for people: empty when it is missing or null, JSON if it is not a scalar.
    static std::string text(const Json& object, std::string_view key);
    /// The same for the value itself.
    static std::string text(const Json& value);

    /// The member as a number; 0 if it is not one.
    static std::uint64_t number(const Json& object, std::string_view key);
    /// The member; a null value if there is none.
    static const Json& member(const Json& object, std::string_view key);
};

} // namespace zrm::host

#endif
