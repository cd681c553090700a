#ifndef ZRM_HOST_URL_TEXT_H
#define ZRM_HOST_URL_TEXT_H

#include <map>
#include <optional>
#include <string>
#include <string_view>

namespace zrm::host {

/// Reads the texts of a URL strictly. Stateless.
class UrlText {
public:
    /// The text behind percent-encoding; none when an encoding is broken, or when what comes out
    /// is no UTF-8 or has a NUL character.
    static std::optional<std::string> decode(std::string_view encoded);

    /// Names and values of a query, in which '+' stands for a blank; none when one of them cannot
    /// be decoded.
    static std::optional<std::multimap<std::string, std::string>> query(std::string_view encoded);
};

} // namespace zrm::host

#endif
