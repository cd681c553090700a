#include "host/config/HttpUrl.h"

#include "host/base/ListenAddress.h"

#include <algorithm>
#include <array>

namespace zrm::host {

namespace {

struct Scheme {
    std::string_view prefix;
    bool isSecure;
    std::uint16_t port;
};

constexpr std::array<Scheme, 2> schemes = {{{"http://", false, 80}, {"https://", true, 443}}};

/// True for characters allowed in a path or a query.
bool isTargetCharacter(char c) {
    constexpr std::string_view others = R"("<>\^`{|}#)";
    return c > ' ' && c < 0x7f && others.find(c) == std::string_view::npos;
}

} // namespace

std::optional<HttpUrl> HttpUrl::parse(std::string_view text) {
    const auto scheme = std::find_if(schemes.begin(), schemes.end(), [&](const Scheme& known) {
        return text.starts_with(known.prefix);
    });
    if (scheme == schemes.end()) {
        return std::nullopt;
    }
    text.remove_prefix(scheme->prefix.size());
    const std::size_t end = std::min(text.find_first_of("/?"), text.size());
    const std::string_view place = text.substr(0, end);
    const std::string_view target = text.substr(end);
    // The port begins at a colon after the last bracket, or at any colon if there are no brackets.
    const std::size_t colon = place.rfind(':');
    const bool hasPort = colon != std::string_view::npos && !place.ends_with(']');
    const std::optional<ListenAddress> address = ListenAddress::parse(
        hasPort ? std::string(place) : std::string(place) + ':' + std::to_string(scheme->port));
    if (!address || address->port == 0 ||
        !std::all_of(target.begin(), target.end(), isTargetCharacter)) {
        return std::nullopt;
    }
    HttpUrl url{scheme->isSecure, address->host, address->port, std::string(target)};
    if (!target.starts_with('/')) {
        url.target.insert(0, 1, '/');
    }
    return url;
}

std::string HttpUrl::authority() const {
    return ListenAddress{host, port}.text();
}

std::string HttpUrl::withPath(std::string_view path) const {
    std::string whole = target;
    std::size_t end = std::min(whole.find('?'), whole.size());
    if (path.starts_with('/') && end > 0 && whole[end - 1] == '/') {
        whole.erase(--end, 1);
    }
    return whole.insert(end, path);
}

} // namespace zrm::host
