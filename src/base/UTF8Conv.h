#ifndef ZRM_UTF8_CONV_H
#define ZRM_UTF8_CONV_H

#include <cstddef>
#include <cstdint>

namespace zrm {

/// Conversion between the process's local code page and UTF-8. Both operations return the number
/// of bytes written, 0 when nothing was converted (no locale, no code page); then `out` is left as
/// it was. Any thread.
class UTF8Conv {
public:
    /// Local code page to UTF-8; a text of n bytes needs at most 3 * n + 1. `flags`: 0 terminates
    /// the output, LOC2_NO_TERMINATOR does not.
    static std::int32_t Convert_toUTF8(char* out, std::size_t outSize, const char* in,
                                       std::size_t inLength, int flags);
    /// UTF-8 to the local code page; the output is terminated.
    static std::int32_t Convert_fromUTF8(char* out, std::size_t outSize, const char* in,
                                         std::size_t inLength);
};

} // namespace zrm

#endif
