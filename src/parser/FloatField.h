#ifndef ZRM_FLOAT_FIELD_H
#define ZRM_FLOAT_FIELD_H

#include "parser/DataType.h"

namespace zrm {

/// Reading of one floating-point number as the C library's scanner reads it: how far the number
/// reaches is decided here, its value by the C library. Any thread.
namespace FloatField {

/// Finds the end of the number that begins at `text` and takes at most `width` characters; null
/// when none begins there. `decimalPoint` is the locale's.
const char* findEnd(const char* text, unsigned width, const char* decimalPoint) noexcept;

/// Converts the characters from `begin` up to `end` and stores the number at `value` (null:
/// nowhere) as a FLOAT, DOUBLE or LONG_DOUBLE. False when they are no number.
bool convert(const char* begin, const char* end, Receiver receiver, void* value) noexcept;

} // namespace FloatField

} // namespace zrm

#endif
