#ifndef ZRM_HOST_URL_TEXT_H
#define ZRM_HOST_URL_TEXT_H

#include <map>
#include <optional>
#include <string>
#include <string_view>

namespace zrm::host {

/// Decodes parts of a URL, strictly, and encodes them. Stateless.
class UrlText {
public:
    /// Decodes percent-encoding; none when an encoding is invalid, or when the result is not UTF-8
    /// or contains a NUL character.
    static std::optional<std::string> decode(std::string_view encoded);

    /// A text as one part of a URL: everything but letters, digits, '-', '.', '_' and '~' as %XX.
    static std::string encode(std::string_view text);

    /// Names and values of a query, where '+' means a blank; none when one of them cannot be
    /// decoded.
    static std::optional<std::multimap<std::string, std::string>> query(std::string_view encoded);
};

} // namespace zrm::host

#endif
