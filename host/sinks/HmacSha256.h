#ifndef ZRM_HOST_HMAC_SHA256_H
#define ZRM_HOST_HMAC_SHA256_H

#include <string>
#include <string_view>

namespace zrm::host {

/// Signs texts with a shared secret (RFC 2104 with SHA-256). Stateless.
class HmacSha256 {
public:
    /// The signature of a text as 64 lower-case hexadecimal digits.
    static std::string hex(std::string_view secret, std::string_view text);
};

} // namespace zrm::host

#endif
