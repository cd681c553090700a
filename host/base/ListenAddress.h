#ifndef ZRM_HOST_LISTEN_ADDRESS_H
#define ZRM_HOST_LISTEN_ADDRESS_H

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>

namespace zrm::host {

/// Where the HTTP server listens.
struct ListenAddress {
    std::string host;       ///< name or number, without brackets
    std::uint16_t port = 0; ///< 0: any free port

    /// Parses "HOST:PORT" or "[IPV6]:PORT"; none for any other text.
    static std::optional<ListenAddress> parse(std::string_view text);

    /// True when only this machine can reach the address.
    bool isLoopback() const;

    /// "HOST:PORT" as in a URL.
    std::string text() const;

    bool operator==(const ListenAddress&) const = default;
};

} // namespace zrm::host

#endif
