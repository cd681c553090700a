#ifndef ZRM_HOST_COMPARISON_H
#define ZRM_HOST_COMPARISON_H

#include "framework/filters.h"

#include <cstdint>
#include <optional>
#include <string_view>

namespace zrm::host {

/// The meaning of the operators. Any thread; neither locks nor allocates.
namespace Comparison {

/// True for the six operators that compare by order.
bool isRelational(_IntfOper op) noexcept;

/// Whether the operator holds for two values, given their order: negative if the first is less, 0
/// if they are equal, positive if it is greater. False for operators that do not compare by order.
bool holds(_IntfOper op, std::int64_t order) noexcept;

/// Parses a number: decimal digits with an optional minus sign and nothing else.
std::optional<std::int64_t> number(std::string_view text) noexcept;

/// -1, 0 or 1 if the first number is less than, equal to or greater than the second.
inline int order(std::int64_t left, std::int64_t right) noexcept {
    return left < right ? -1 : left > right ? 1 : 0;
}

} // namespace Comparison

} // namespace zrm::host

#endif
