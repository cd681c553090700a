#ifndef ZRM_UTF8_CONV_H
#define ZRM_UTF8_CONV_H

#include <cstddef>
#include <cstdint>
#include <string_view>

namespace zrm {

/// Converts between the process's local code page and UTF-8. All functions return the number of
/// bytes written, or 0 if nothing was converted (no locale or no code page), in which case `out` is
/// unchanged. Any thread.
class UTF8Conv {
public:
    /// Converts from the local code page to UTF-8. n bytes of text need at most 3 * n + 1 bytes.
    /// With `flags` 0 the output is terminated, with LOC2_NO_TERMINATOR it is not.
    static std::int32_t Convert_toUTF8(char* out, std::size_t outSize, const char* in,
                                       std::size_t inLength, int flags);
    /// Does the same for a column of a followed log's entry, without a terminator. ASCII is copied
    /// if the local code page has it as UTF-8 does, which costs less than to ask the framework.
    /// That is found out once for all, and again when a trace level changes.
    static std::int32_t columnToUTF8(char* out, std::size_t outSize, std::string_view in);
    /// Converts from UTF-8 to the local code page. The output is terminated.
    static std::int32_t Convert_fromUTF8(char* out, std::size_t outSize, const char* in,
                                         std::size_t inLength);
};

} // namespace zrm

#endif
