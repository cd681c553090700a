#ifndef ZRM_HOST_CONDITION_H
#define ZRM_HOST_CONDITION_H

#include "framework/filters.h"

#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// The host's own operators, beside those of _IntfOper.
inline constexpr _IntfOper INTF_CONTAINS = static_cast<_IntfOper>(101);
inline constexpr _IntfOper INTF_STARTS = static_cast<_IntfOper>(102);
inline constexpr _IntfOper INTF_MATCHES = static_cast<_IntfOper>(103); ///< RE2, linear time
inline constexpr _IntfOper INTF_IN = static_cast<_IntfOper>(104);      ///< one of several values

/// One condition on a column, as an operator states it: COLUMN OP VALUE. The value is text for
/// character columns and a number for integer columns; `in` has several.
struct Condition {
    std::string column; ///< upper-case name
    _IntfOper op = INTF_EQUAL;
    std::string text;                ///< value of a character column
    std::int64_t number = 0;         ///< value of an integer column
    bool isNumber = false;           ///< which of the two holds
    std::vector<std::string> values; ///< values of INTF_IN
    bool operator==(const Condition&) const = default;
};

/// Whether this is a column by which a situation states its thresholds. A condition on it is a
/// parameter of the situation: the table reads it and writes the column itself, so it is never
/// compared with a row.
inline bool isThresholdColumn(std::string_view column) noexcept {
    return column == "FREQTHRESH" || column == "PERIODTHRS";
}

} // namespace zrm::host

#endif
