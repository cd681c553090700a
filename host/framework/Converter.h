#ifndef ZRM_HOST_CONVERTER_H
#define ZRM_HOST_CONVERTER_H

#include "host/framework/CodePages.h"

#include <cstddef>
#include <string_view>

namespace zrm::host {

/// Outcome of a conversion.
struct Converted {
    std::size_t written;   ///< bytes
    bool complete;         ///< false: the target was full
    bool supported = true; ///< false: the system converts no such pair; nothing was written
};

/// Converts text between two code sets, substituting what is not valid in the source or has no
/// place in the target: by U+FFFD in UTF-8, by the control character SUB (0x1A) in a single-byte
/// code set, by a question mark in any other. A full target ends at a character boundary. Any
/// thread; the system's converters are opened once per thread and pair, after that nothing locks
/// or allocates.
class Converter {
public:
    static Converted convert(const LOC2_Locale& to, char* target, std::size_t targetSize,
                             const LOC2_Locale& from, std::string_view source) noexcept;
};

} // namespace zrm::host

#endif
