#ifndef ZRM_HOST_ICONV_CACHE_H
#define ZRM_HOST_ICONV_CACHE_H

#include "host/framework/CodePages.h"

#include <iconv.h>

namespace zrm::host {

/// The calling thread's open converters. They are closed when the thread ends; a later conversion
/// on that thread, while the process exits, reopens its converter.
namespace IconvCache {

/// What iconv_open returns when it fails.
inline iconv_t none() noexcept {
    return reinterpret_cast<iconv_t>(-1);
}

/// The converter for this pair in its initial state; none() when the system has no such converter.
iconv_t find(const LOC2_Locale& to, const LOC2_Locale& from) noexcept;

} // namespace IconvCache

} // namespace zrm::host

#endif
