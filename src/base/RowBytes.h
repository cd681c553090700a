#ifndef ZRM_ROW_BYTES_H
#define ZRM_ROW_BYTES_H

#include <cstddef>

namespace zrm {

/// Blanking and copying of a row's bytes for the per-line path. Out of line on purpose: where a
/// compiler knows a length or its bound, it may put a string instruction in place of memset or
/// memcpy, and that takes several times as long.
namespace RowBytes {

void blank(char* bytes, std::size_t length) noexcept;
void copy(char* bytes, const char* from, std::size_t length) noexcept;

} // namespace RowBytes

} // namespace zrm

#endif
