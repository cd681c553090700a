#include "host/framework/Comparison.h"

#include <charconv>

namespace zrm::host {

bool Comparison::isRelational(_IntfOper op) noexcept {
    return op >= INTF_EQUAL && op <= INTF_GREATER;
}

bool Comparison::holds(_IntfOper op, std::int64_t order) noexcept {
    switch (op) {
    case INTF_EQUAL:
        return order == 0;
    case INTF_NOT_EQUAL:
        return order != 0;
    case INTF_GREATER_OR_EQUAL:
        return order >= 0;
    case INTF_LESS_OR_EQUAL:
        return order <= 0;
    case INTF_LESS:
        return order < 0;
    case INTF_GREATER:
        return order > 0;
    }
    return false;
}

std::optional<std::int64_t> Comparison::number(std::string_view text) noexcept {
    std::int64_t value = 0;
    const char* const end = text.data() + text.size();
    const auto result = std::from_chars(text.data(), end, value);
    if (result.ec != std::errc() || result.ptr != end) {
        return std::nullopt;
    }
    return value;
}

} // namespace zrm::host
