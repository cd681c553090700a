#ifndef ZRM_HOST_COLUMN_TEXT_H
#define ZRM_HOST_COLUMN_TEXT_H

#include <cstddef>
#include <string_view>

namespace zrm::host {

/// The text of a fixed-width character field: what is before its first NUL, or before the
/// field's end, without trailing blanks. The one rule by which the host reads, compares and shows
/// character columns. Any thread.
namespace ColumnText {

/// The field's text; a view into the field.
std::string_view unpadded(const char* field, std::size_t width) noexcept;

/// A text without its trailing blanks.
std::string_view withoutTrailingBlanks(std::string_view text) noexcept;

/// True when the rest of a field is only padding: blanks up to a NUL or the end.
bool isPadding(const char* rest, std::size_t width) noexcept;

/// Compares a field with a value as if the shorter of the two were padded with blanks. Negative,
/// 0 or positive as the field's text is less, equal or greater, byte by byte and unsigned.
int compare(const char* field, std::size_t width, std::string_view value) noexcept;

} // namespace ColumnText

} // namespace zrm::host

#endif
