#ifndef ZRM_HOST_OPERATORS_H
#define ZRM_HOST_OPERATORS_H

#include "framework/filters.h"

#include <cstdint>
#include <memory>
#include <string_view>
#include <vector>

namespace re2 {
class RE2;
}

// What conditions on columns and on fields have in common.

namespace zrm::host {

/// True for the six operators that compare by order.
bool isRelational(_IntfOper op) noexcept;

/// Whether the operator holds for two values, given their order: negative if the first is less, 0
/// if they are equal, positive if it is greater. False for operators that do not compare by order.
bool compares(_IntfOper op, std::int64_t order) noexcept;

/// -1, 0 or 1 if the first number is less than, equal to or greater than the second.
template <typename Number> int orderOf(Number left, Number right) noexcept {
    return left < right ? -1 : left > right ? 1 : 0;
}

/// The value of a filter as text; a view into it.
std::string_view textOf(const SEL1_FILTERINFO& filter) noexcept;

/// The values of INTF_IN; views into the text.
std::vector<std::string_view> linesOf(std::string_view text);

enum class PatternText : unsigned char { utf8, bytes };

/// How a pattern is matched with a column. Columns in a local code page other than UTF-8 are
/// matched byte by byte; the pattern must then be ASCII.
PatternText patternTextOf(bool isUtf8Column, std::string_view pattern);

/// A regular expression, which says whether it is usable.
std::unique_ptr<re2::RE2> compiledPattern(std::string_view pattern, PatternText text);

} // namespace zrm::host

#endif
