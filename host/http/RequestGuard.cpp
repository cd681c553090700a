#include "host/http/RequestGuard.h"

#include <algorithm>
#include <utility>

namespace {

constexpr std::uint16_t httpPort = 80; ///< the port that an authority may leave out

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

RequestGuard::RequestGuard(const ListenAddress& address, ApiToken token)
    : m_token(std::move(token)) {
    std::vector<std::string> hosts = {address.host, "localhost"};
    if (address.isLoopback()) {
        hosts.insert(hosts.end(), {"127.0.0.1", "::1"});
    }
    for (const std::string& host : hosts) {
        const std::string authority = lowerCase(ListenAddress{host, address.port}.text());
        m_authorities.push_back(authority);
        if (address.port == httpPort) {
            m_authorities.push_back(authority.substr(0, authority.rfind(':')));
        }
    }
}

bool RequestGuard::isOurs(std::string_view authority) const {
    return std::find(m_authorities.begin(), m_authorities.end(), lowerCase(authority)) !=
           m_authorities.end();
}

std::optional<Problem> RequestGuard::refuse(const Headers& headers, bool isPublic) const {
    if (!headers.host || !isOurs(*headers.host)) {
        return Problem{421, "the Host header must be the address at which the agent listens",
                       "Host"};
    }
    constexpr std::string_view scheme = "http://";
    if (headers.origin && (!headers.origin->starts_with(scheme) ||
                           !isOurs(std::string_view(*headers.origin).substr(scheme.size())))) {
        return Problem{403, "requests of other origins are refused", "Origin"};
    }
    if (isPublic) {
        return std::nullopt;
    }
    constexpr std::string_view bearer = "bearer ";
    const std::string& authorization = headers.authorization.value_or("");
    if (lowerCase(std::string_view(authorization).substr(0, bearer.size())) != bearer) {
        return Problem{401, "send the API token: Authorization: Bearer TOKEN", "Authorization"};
    }
    if (!m_token.matches(std::string_view(authorization).substr(bearer.size()))) {
        return Problem{401, "the token is not the one in the agent's token file", "Authorization"};
    }
    return std::nullopt;
}
