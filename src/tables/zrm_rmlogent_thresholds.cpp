// The frequency and period thresholds of a situation, read from its conditions.

#include "base/TraceScope.h"
#include "tables/zrm_rmlogent_agent.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <span>

namespace zrm {

namespace {

TRC1_Anchor anchor{"zrm_rmlogent_thresholds.cpp"};

constexpr _IntfOper frequencyOperators[] = {INTF_GREATER_OR_EQUAL, INTF_LESS_OR_EQUAL, INTF_LESS,
                                            INTF_GREATER};
constexpr _IntfOper periodOperators[] = {INTF_EQUAL};

struct ThresholdRule {
    const char* column;
    std::span<const _IntfOper> operators;
};

constexpr ThresholdRule frequencyRule{"FREQTHRESH", frequencyOperators};
constexpr ThresholdRule periodRule{"PERIODTHRS", periodOperators};

constexpr int integerSize = sizeof(std::int64_t);

bool isOn(const ThresholdRule& rule, const SEL1_FILTERINFO& filter) {
    return std::strcmp(filter.columnName, rule.column) == 0;
}

template <typename Integer> std::int64_t readInteger(const char* value) {
    Integer integer;
    std::memcpy(&integer, value, sizeof integer);
    return integer;
}

/// True if the filter states the threshold in an acceptable way; then reads its value. Lengths
/// other than 2 and 4 are read as 8 bytes.
bool readThreshold(const ThresholdRule& rule, const SEL1_FILTERINFO& filter, std::int64_t& value) {
    TraceScope trace(anchor);
    if (filter.dataType != SEL1_INTEGER) {
        trace.error()("Invalid %s threshold data type; value is %d, expected value is %d.  "
                      "Threshold ignored.",
                      rule.column, filter.dataType, SEL1_INTEGER);
        return trace.result(false);
    }
    if (std::ranges::find(rule.operators, filter.compareOperator) == rule.operators.end()) {
        trace.error()("Invalid %s threshold compare operator; value is %d. Threshold ignored.",
                      rule.column, filter.compareOperator);
        return trace.result(false);
    }
    if (filter.valueLength < 0 || filter.valueLength > integerSize) {
        trace.error()("Size of %s threshold is %d which does not equal expected size of %d. "
                      "Threshold ignored.",
                      rule.column, filter.valueLength, integerSize);
        return trace.result(false);
    }
    switch (filter.valueLength) {
    case sizeof(std::int16_t):
        value = readInteger<std::int16_t>(filter.value);
        break;
    case sizeof(std::int32_t):
        value = readInteger<std::int32_t>(filter.value);
        break;
    default:
        value = readInteger<std::int64_t>(filter.value);
    }
    return trace.result(true);
}

/// The smallest or largest count that meets the condition. Wraps around at the type's ends.
std::int64_t inclusiveBound(_IntfOper op, std::int64_t value) {
    auto bits = static_cast<std::uint64_t>(value);
    if (op == INTF_LESS) {
        --bits;
    } else if (op == INTF_GREATER) {
        ++bits;
    }
    return static_cast<std::int64_t>(bits);
}

/// The frequency threshold in the filter, negated for upper bounds; 0: none.
std::int64_t frequencyOf(const SEL1_FILTERINFO& filter) {
    TraceScope trace(anchor);
    std::int64_t value = 0;
    if (!readThreshold(frequencyRule, filter, value)) {
        return trace.result(std::int64_t{0});
    }
    const std::int64_t bound = inclusiveBound(filter.compareOperator, value);
    if (bound < 1) {
        return trace.result(std::int64_t{0});
    }
    const bool isUpperBound =
        filter.compareOperator == INTF_LESS_OR_EQUAL || filter.compareOperator == INTF_LESS;
    trace.fine()("Frequency threshold is %s %ld.",
                 isUpperBound ? "<=" : ">=", static_cast<long>(bound));
    return trace.result(isUpperBound ? -bound : bound);
}

/// The period threshold in the filter, in seconds; 0: none.
std::int64_t periodOf(const SEL1_FILTERINFO& filter) {
    TraceScope trace(anchor);
    std::int64_t value = 0;
    if (!readThreshold(periodRule, filter, value) || value < 1) {
        return trace.result(std::int64_t{0});
    }
    trace.fine()("Period threshold is %ld.", static_cast<long>(value));
    return trace.result(value);
}

} // namespace

void zrm_rmlogent_agent::getFreqPeriodThresholds() {
    const TraceScope trace(anchor);
    ResetFilterIndex();
    SEL1_FILTERINFO* filter = nullptr;
    while (!hasThresholds() && GetFilterInfo(&filter) == 0) {
        trace.detail()("Filter column name  = %s.", filter->columnName);
        if (isOn(frequencyRule, *filter) && thresholds.freqThreshold == 0) {
            thresholds.freqThreshold = frequencyOf(*filter);
        } else if (isOn(periodRule, *filter) && thresholds.periodThreshold == 0) {
            thresholds.periodThreshold = periodOf(*filter);
        }
    }
}

} // namespace zrm
