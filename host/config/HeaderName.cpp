#include "host/config/HeaderName.h"

#include <algorithm>
#include <array>
#include <string>

namespace zrm::host {

namespace {

std::string lowerCase(std::string_view name) {
    std::string lower(name);
    std::transform(lower.begin(), lower.end(), lower.begin(),
                   [](char c) { return c >= 'A' && c <= 'Z' ? static_cast<char>(c + 32) : c; });
    return lower;
}

bool isLetterOrDigit(char c) {
    return (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9');
}

} // namespace

bool isAddableHeader(std::string_view name) {
    constexpr std::array<std::string_view, 10> own = {
        "host",   "content-length", "content-type",    "transfer-encoding", "connection",
        "expect", "user-agent",     "accept-encoding", "idempotency-key",   "x-zrm-signature"};
    constexpr std::string_view signs = "!#$%&'*+-.^_`|~";
    const std::string lower = lowerCase(name);
    return !name.empty() && std::find(own.begin(), own.end(), lower) == own.end() &&
           std::all_of(lower.begin(), lower.end(), [&](char c) {
               return isLetterOrDigit(c) || signs.find(c) != std::string_view::npos;
           });
}

bool isSecretHeader(std::string_view name) {
    constexpr std::array<std::string_view, 6> parts = {"auth",   "token",    "key",
                                                       "secret", "password", "cookie"};
    const std::string lower = lowerCase(name);
    return std::any_of(parts.begin(), parts.end(), [&](std::string_view part) {
        return lower.find(part) != std::string::npos;
    });
}

} // namespace zrm::host
