#ifndef ZRM_HOST_HTTP_URL_H
#define ZRM_HOST_HTTP_URL_H

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace zrm::host {

/// The URL of an HTTP server or resource.
struct HttpUrl {
    bool isSecure = false;  ///< https
    std::string host;       ///< name or number, without brackets
    std::uint16_t port = 0; ///< the scheme's default when the URL has none
    std::string target;     ///< path and query; "/" when the URL has none

    /// Parses "http://HOST[:PORT][/PATH][?QUERY]", or the same with https. None for any other text,
    /// including a URL with a user name or a fragment.
    static std::optional<HttpUrl> parse(std::string_view text);

    /// "HOST:PORT" as in a URL.
    std::string authority() const;

    /// The target with this path appended to its own, before the query.
    std::string withPath(std::string_view path) const;

    bool operator==(const HttpUrl&) const = default;
};

} // namespace zrm::host

#endif
