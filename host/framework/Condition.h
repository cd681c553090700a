#ifndef ZRM_HOST_CONDITION_H
#define ZRM_HOST_CONDITION_H

#include "framework/filters.h"

#include <cstdint>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// The host's own operators, beside those of _IntfOper.
inline constexpr _IntfOper INTF_CONTAINS = static_cast<_IntfOper>(101);
inline constexpr _IntfOper INTF_STARTS = static_cast<_IntfOper>(102);
inline constexpr _IntfOper INTF_MATCHES = static_cast<_IntfOper>(103); ///< RE2, linear time
inline constexpr _IntfOper INTF_IN = static_cast<_IntfOper>(104);      ///< one of several values

/// The name of a field in "field.NAME"; none if this is the name of a column. A view into it.
constexpr std::optional<std::string_view> fieldOf(std::string_view column) noexcept {
    constexpr std::string_view prefix = "field.";
    return column.starts_with(prefix) ? std::optional(column.substr(prefix.size())) : std::nullopt;
}

/// One condition on a column or a field, as an operator states it: COLUMN OP VALUE. The value is
/// text for character columns and a number for integer columns; for a field it is what the operator
/// wrote. `in` has several.
struct Condition {
    std::string column; ///< upper-case name, or "field." and the field's name
    _IntfOper op = INTF_EQUAL;
    std::string text;                ///< value of a character column or a field
    std::int64_t number = 0;         ///< value of an integer column
    bool isNumber = false;           ///< the value is a number, which for a field is in `text`
    std::vector<std::string> values; ///< values of INTF_IN

    bool isOnField() const noexcept { return fieldOf(column).has_value(); }
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
