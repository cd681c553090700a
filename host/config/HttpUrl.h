#ifndef ZRM_HOST_HTTP_URL_H
#define ZRM_HOST_HTTP_URL_H

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace zrm::host {

/// The URL of something that is asked over HTTP.
struct HttpUrl {
    bool isSecure = false;  ///< https
    std::string host;       ///< name or number, without brackets
    std::uint16_t port = 0; ///< that of the scheme where the URL gives none
    std::string target;     ///< path and query; "/" where the URL has none

    /// Reads "http://HOST[:PORT][/PATH][?QUERY]", or the same with https; none for any other text,
    /// one with a user's name or a fragment among them.
    static std::optional<HttpUrl> parse(std::string_view text);

    /// "HOST:PORT" as in a URL.
    std::string authority() const;

    /// The target with this path behind its own and before its query.
    std::string withPath(std::string_view path) const;

    bool operator==(const HttpUrl&) const = default;
};

} // namespace zrm::host

#endif
