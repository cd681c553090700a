#include "host/sinks/HmacSha256.h"

#include <array>

#include <openssl/evp.h>
#include <openssl/hmac.h>

namespace zrm::host {

std::string HmacSha256::hex(std::string_view secret, std::string_view text) {
    constexpr char digits[] = "0123456789abcdef";
    std::array<unsigned char, EVP_MAX_MD_SIZE> signature{};
    unsigned length = 0;
    HMAC(EVP_sha256(), secret.data(), static_cast<int>(secret.size()),
         reinterpret_cast<const unsigned char*>(text.data()), text.size(), signature.data(),
         &length);
    std::string hex;
    for (unsigned at = 0; at < length; ++at) {
        hex += digits[signature[at] >> 4];
        hex += digits[signature[at] & 15];
    }
    return hex;
}

} // namespace zrm::host
