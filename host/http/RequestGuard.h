#ifndef ZRM_HOST_REQUEST_GUARD_H
#define ZRM_HOST_REQUEST_GUARD_H

#include "host/base/ListenAddress.h"
#include "host/http/ApiToken.h"
#include "host/http/Refusal.h"
#include "host/http/TlsContext.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// Decides which requests may reach the API: those that are meant for this server and carry the
/// token. A web page of another origin cannot make a browser send requests here, not even through a
/// name that it points here. Immutable, so any thread.
class RequestGuard {
public:
    /// The parts of a request that the decision needs; missing headers are none.
    struct Headers {
        std::optional<std::string> host;
        std::optional<std::string> origin;
        std::optional<std::string> authorization;
    };

    /// `address` is where the server listens, with its actual port. Under TLS, the names in the
    /// certificate are also names of the server.
    RequestGuard(const ListenAddress& address, ApiToken token,
                 std::shared_ptr<const TlsContext> tls = nullptr);

    /// Whether the request is allowed. `isPublic`: it needs no token.
    Result<void, Refusal> check(const Headers& headers, bool isPublic) const;

private:
    bool isOurs(std::string_view authority) const;
    bool isInCertificate(std::string_view authority) const;

    std::vector<std::string>
        m_authorities; ///< accepted values of the Host header, HOST:PORT in lower case
    ApiToken m_token;
    std::shared_ptr<const TlsContext> m_tls; ///< null: no TLS
    std::uint16_t m_port;
};

} // namespace zrm::host

#endif
