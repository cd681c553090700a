#ifndef ZRM_HOST_JSON_FIELDS_H
#define ZRM_HOST_JSON_FIELDS_H

#include <cstddef>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include <nlohmann/json_fwd.hpp>

namespace zrm::host {

/// The members of a JSON object of a request's body while they are read: gives values by key and
/// type and knows which keys nobody asked for. Whatever is wrong is thrown as RequestRefused, with
/// status 400 and the place in the body as its field. A member that is null counts as missing.
class JsonFields {
public:
    /// Reads a body, which must be one object; an empty body counts as {}. Objects and lists that
    /// lie deeper than 32, a key that comes twice, and texts that are no UTF-8 are refused.
    explicit JsonFields(std::string_view body);
    JsonFields(JsonFields&& other) noexcept;
    ~JsonFields();

    bool has(std::string_view key) const;

    /// A text without NUL characters; empty texts too.
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

    /// Any value; null when the key is missing. It lives as long as the body's own fields.
    const nlohmann::json& value(std::string_view key);

    /// The place of a member in the body, for example definition.when[0].
    std::string place(std::string_view key) const;
    std::string place(std::string_view key, std::size_t index) const;

    /// Refuses the request because of a member.
    [[noreturn]] void refuse(std::string_view key, const std::string& detail) const;

    /// Every member that was not asked for is refused. To be called when all were.
    void refuseUnknown() const;

private:
    JsonFields(std::shared_ptr<const nlohmann::json> object, std::string prefix);

    const nlohmann::json* find(std::string_view key);
    const nlohmann::json& required(std::string_view key);

    std::shared_ptr<const nlohmann::json> m_object;
    std::string m_prefix;             ///< stands before a key in a place
    std::vector<std::string> m_known; ///< keys that were asked for, in that order
};

} // namespace zrm::host

#endif
