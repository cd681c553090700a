#ifndef ZRM_FLOAT_FIELD_H
#define ZRM_FLOAT_FIELD_H

#include "parser/DataType.h"

namespace zrm {

/// Reads a floating-point number as the C library's scanner does. This code decides where the
/// number ends; the C library computes its value. Any thread.
namespace FloatField {

/// Finds the end of the number that begins at `text` and has at most `width` characters. Null if no
/// number begins there. `decimalPoint` is the locale's.
const char* findEnd(const char* text, unsigned width, const char* decimalPoint) noexcept;

/// Converts the characters from `begin` to `end` and stores the number at `value` (null: nowhere)
/// as a FLOAT, DOUBLE or LONG_DOUBLE. Returns false if they are not a number.
bool convert(const char* begin, const char* end, Receiver receiver, void* value) noexcept;

} // namespace FloatField

} // namespace zrm

#endif
