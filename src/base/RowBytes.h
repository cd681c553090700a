#ifndef ZRM_ROW_BYTES_H
#define ZRM_ROW_BYTES_H

#include <cstddef>

namespace zrm {

/// Blanks and copies a row's bytes on the per-line path. Deliberately out of line: a compiler that
/// knows the length or its bound may replace memset or memcpy with a string instruction, which is
/// several times slower.
namespace RowBytes {

void blank(char* bytes, std::size_t length) noexcept;
void copy(char* bytes, const char* from, std::size_t length) noexcept;

} // namespace RowBytes

} // namespace zrm

#endif
