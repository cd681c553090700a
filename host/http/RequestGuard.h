#ifndef ZRM_HOST_REQUEST_GUARD_H
#define ZRM_HOST_REQUEST_GUARD_H

#include "host/base/ListenAddress.h"
#include "host/http/ApiToken.h"
#include "host/http/Problem.h"
#include "host/http/TlsContext.h"

#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// Decides which requests may reach the API: those that were meant for this server (a web page of
/// another origin cannot make a browser ask it, also not through a name that it points here), and
/// that carry the token. Immutable, so any thread.
class RequestGuard {
public:
    /// What the decision needs of a request; missing headers are absent.
    struct Headers {
        std::optional<std::string> host;
        std::optional<std::string> origin;
        std::optional<std::string> authorization;
    };

    /// `address` is where the server listens, with the port that it really has. Under TLS the
    /// names of the certificate are names of the server too.
    RequestGuard(const ListenAddress& address, ApiToken token,
                 std::shared_ptr<const TlsContext> tls = nullptr);

    /// Why the request is refused; none when it may pass. `isPublic`: needs no token.
    std::optional<Problem> refuse(const Headers& headers, bool isPublic) const;

private:
    bool isOurs(std::string_view authority) const;
    bool isInCertificate(std::string_view authority) const;

    std::vector<std::string>
        m_authorities; ///< HOST:PORT as the Host header may have it, lower case
    ApiToken m_token;
    std::shared_ptr<const TlsContext> m_tls; ///< null: without TLS
    std::uint16_t m_port;
};

} // namespace zrm::host

#endif
