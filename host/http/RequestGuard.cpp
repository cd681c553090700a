#include "host/http/RequestGuard.h"

#include <algorithm>
#include <utility>

namespace zrm::host {

namespace {

// The default ports, which an authority may leave out.
constexpr std::uint16_t httpPort = 80;
constexpr std::uint16_t httpsPort = 443;

std::string lowerCase(std::string_view text) {
    std::string lower(text);
    for (char& c : lower) {
        if (c >= 'A' && c <= 'Z') {
            c = static_cast<char>(c - 'A' + 'a');
        }
    }
    return lower;
}

} // namespace

RequestGuard::RequestGuard(const ListenAddress& address, ApiToken token,
                           std::shared_ptr<const TlsContext> tls)
    : m_token(std::move(token)), m_tls(std::move(tls)), m_port(address.port) {
    std::vector<std::string> hosts = {address.host, "localhost"};
    if (address.isLoopback()) {
        hosts.insert(hosts.end(), {"127.0.0.1", "::1"});
    }
    for (const std::string& host : hosts) {
        const std::string authority = lowerCase(ListenAddress{host, address.port}.text());
        m_authorities.push_back(authority);
        if (address.port == (m_tls == nullptr ? httpPort : httpsPort)) {
            m_authorities.push_back(authority.substr(0, authority.rfind(':')));
        }
    }
}

bool RequestGuard::isOurs(std::string_view authority) const {
    return std::find(m_authorities.begin(), m_authorities.end(), lowerCase(authority)) !=
               m_authorities.end() ||
           isInCertificate(authority);
}

bool RequestGuard::isInCertificate(std::string_view authority) const {
    if (m_tls == nullptr) {
        return false;
    }
    std::optional<ListenAddress> named = ListenAddress::parse(authority);
    if (!named && m_port == httpsPort) {
        named = ListenAddress::parse(std::string(authority) + ":443");
    }
    return named && named->port == m_port && m_tls->isFor(named->host);
}

Result<void, Refusal> RequestGuard::check(const Headers& headers, bool isPublic) const {
    if (!headers.host || !isOurs(*headers.host)) {
        return tl::unexpected(
            Refusal(421, "the Host header must be the address at which the agent listens", "Host"));
    }
    const std::string_view scheme = m_tls == nullptr ? "http://" : "https://";
    if (headers.origin && (!headers.origin->starts_with(scheme) ||
                           !isOurs(std::string_view(*headers.origin).substr(scheme.size())))) {
        return tl::unexpected(Refusal(403, "requests from other origins are refused", "Origin"));
    }
    if (isPublic) {
        return {};
    }
    constexpr std::string_view bearer = "bearer ";
    const std::string& authorization = headers.authorization.value_or("");
    if (lowerCase(std::string_view(authorization).substr(0, bearer.size())) != bearer) {
        return tl::unexpected(
            Refusal(401, "send the API token: Authorization: Bearer TOKEN", "Authorization"));
    }
    if (!m_token.matches(std::string_view(authorization).substr(bearer.size()))) {
        return tl::unexpected(
            Refusal(401, "the token is not the one in the agent's token file", "Authorization"));
    }
    return {};
}

} // namespace zrm::host
