#ifndef ZRM_HOST_JSON_FIELDS_H
#define ZRM_HOST_JSON_FIELDS_H

#include "host/base/Result.h"

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include <nlohmann/json_fwd.hpp>

namespace zrm::host {

/// Reads the members of a JSON object in a request's body: returns values by key and type and knows
/// which keys have not been read. Errors are thrown as RequestRefused, with status 400 and the
/// location in the body as the field. A null member counts as missing.
class JsonFields {
public:
    /// Parses a body, which must be one object; an empty body counts as {}. Refuses nesting deeper
    /// than 32, duplicate keys, and texts that are not UTF-8.
    explicit JsonFields(std::string_view body);
    JsonFields(JsonFields&& other) noexcept;
    ~JsonFields();

    bool has(std::string_view key) const;

    /// All keys of the object, in alphabetical order.
    std::vector<std::string> keys() const;

    /// A text without NUL characters; may be empty.
    std::string text(std::string_view key);
    std::optional<std::string> optionalText(std::string_view key);

    /// A whole number within the limits.
    std::int64_t number(std::string_view key, std::int64_t least, std::int64_t most);
    std::optional<std::int64_t> optionalNumber(std::string_view key, std::int64_t least,
                                               std::int64_t most);

    /// A list of at most `most` texts; empty when the key is missing.
    std::vector<std::string> texts(std::string_view key, std::size_t most);

    /// An object.
    JsonFields object(std::string_view key);
    std::optional<JsonFields> optionalObject(std::string_view key);

    /// Any value; null when the key is missing. Valid as long as the fields of the whole body.
    const nlohmann::json& value(std::string_view key);

    /// The location of a member in the body, for example definition.when[0].
    std::string place(std::string_view key) const;
    std::string place(std::string_view key, std::size_t index) const;

    /// Refuses the request, naming a member.
    [[noreturn]] void refuse(std::string_view key, const std::string& detail) const;
    [[noreturn]] void refuse(std::string_view key, Problem problem) const;

    /// Refuses members that have not been read. Call it last.
    void refuseUnknown() const;

private:
    JsonFields(std::shared_ptr<const nlohmann::json> object, std::string prefix);

    const nlohmann::json* find(std::string_view key);
    const nlohmann::json& required(std::string_view key);

    std::shared_ptr<const nlohmann::json> m_object;
    std::string m_prefix;             ///< precedes a key in a location
    std::vector<std::string> m_known; ///< keys that have been read, in that order
};

} // namespace zrm::host

#endif
