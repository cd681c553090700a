#include "host/config/Thresholds.h"

#include "host/base/TimeText.h"

#include <algorithm>
#include <array>
#include <charconv>
#include <cstdint>
#include <limits>

namespace zrm::host {

namespace {

constexpr std::int64_t largest = std::numeric_limits<std::int32_t>::max();

struct Bound {
    std::string_view sign;
    _IntfOper op;
    std::int64_t least; ///< the smallest number that means a bound of at least one entry

    bool isReachable(std::int64_t number) const noexcept {
        return number >= least && number < largest;
    }
};

constexpr std::array<Bound, 4> bounds = {{{">=", INTF_GREATER_OR_EQUAL, 1},
                                          {"<=", INTF_LESS_OR_EQUAL, 1},
                                          {">", INTF_GREATER, 0},
                                          {"<", INTF_LESS, 2}}};

/// Parses a number at the beginning of the text and removes it.
std::optional<std::int64_t> takeNumber(std::string_view& text) {
    std::int64_t number = 0;
    if (text.empty() || text.front() == '-') {
        return std::nullopt;
    }
    const auto [end, error] = std::from_chars(text.data(), text.data() + text.size(), number);
    if (error != std::errc()) {
        return std::nullopt;
    }
    text.remove_prefix(static_cast<std::size_t>(end - text.data()));
    return number;
}

Condition condition(const char* column, _IntfOper op, std::int64_t number) {
    Condition condition;
    condition.column = column;
    condition.op = op;
    condition.number = number;
    condition.isNumber = true;
    return condition;
}

} // namespace

std::optional<Condition> Thresholds::frequency(std::string_view text) {
    for (const Bound& bound : bounds) {
        if (text.starts_with(bound.sign)) {
            text.remove_prefix(bound.sign.size());
            while (text.starts_with(' ')) {
                text.remove_prefix(1);
            }
            const std::optional<std::int64_t> number = takeNumber(text);
            if (!number || !text.empty() || !bound.isReachable(*number)) {
                return std::nullopt;
            }
            return condition("FREQTHRESH", bound.op, *number);
        }
    }
    return std::nullopt;
}

std::optional<Condition> Thresholds::period(std::string_view text) {
    const std::optional<std::chrono::seconds> length = DurationText::parse(text);
    return length ? std::optional(condition("PERIODTHRS", INTF_EQUAL, length->count()))
                  : std::nullopt;
}

bool Thresholds::isFrequency(const Condition& condition) noexcept {
    return std::any_of(bounds.begin(), bounds.end(), [&](const Bound& bound) {
        return bound.op == condition.op && bound.isReachable(condition.number);
    });
}

bool Thresholds::isPeriod(const Condition& condition) noexcept {
    return condition.op == INTF_EQUAL && condition.number >= 1;
}

} // namespace zrm::host
