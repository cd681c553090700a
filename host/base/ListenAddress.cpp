#include "host/base/ListenAddress.h"

#include <algorithm>
#include <charconv>

#include <arpa/inet.h>
#include <netinet/in.h>

namespace zrm::host {

std::optional<ListenAddress> ListenAddress::parse(std::string_view text) {
    const std::size_t colon = text.rfind(':');
    if (colon == std::string_view::npos) {
        return std::nullopt;
    }
    std::string_view host = text.substr(0, colon);
    const std::string_view port = text.substr(colon + 1);
    if (host.starts_with('[') && host.ends_with(']')) {
        host = host.substr(1, host.size() - 2);
    } else if (host.find(':') != std::string_view::npos) {
        return std::nullopt; // an IPv6 address needs its brackets
    }
    ListenAddress address;
    address.host = host;
    const bool isHost = !host.empty() && std::all_of(host.begin(), host.end(), [](char c) {
        return (c >= 'a' && c <= 'z') || (c >= 'A' && c <= 'Z') || (c >= '0' && c <= '9') ||
               c == '.' || c == '-' || c == ':';
    });
    const auto [end, error] = std::from_chars(port.data(), port.data() + port.size(), address.port);
    if (!isHost || port.empty() || error != std::errc() || end != port.data() + port.size()) {
        return std::nullopt;
    }
    return address;
}

bool ListenAddress::isLoopback() const {
    in_addr v4{};
    if (inet_pton(AF_INET, host.c_str(), &v4) == 1) {
        return (ntohl(v4.s_addr) >> 24) == 127;
    }
    in6_addr v6{};
    if (inet_pton(AF_INET6, host.c_str(), &v6) == 1) {
        return IN6_IS_ADDR_LOOPBACK(&v6) != 0;
    }
    return host == "localhost";
}

std::string ListenAddress::text() const {
    const bool isV6 = host.find(':') != std::string::npos;
    return (isV6 ? '[' + host + ']' : host) + ':' + std::to_string(port);
}

} // namespace zrm::host
