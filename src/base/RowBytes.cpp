#include "base/RowBytes.h"

#include <cstring>

namespace zrm {

void RowBytes::blank(char* bytes, std::size_t length) noexcept {
    std::memset(bytes, ' ', length);
}

void RowBytes::copy(char* bytes, const char* from, std::size_t length) noexcept {
    if (length > 0) { // an empty text may have no address
        std::memcpy(bytes, from, length);
    }
}

} // namespace zrm
