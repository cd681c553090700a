#include "host/framework/FilterList.h"

#include <algorithm>
#include <cstring>
#include <limits>

namespace zrm::host {

namespace {

/// The agent reads a time stamp as 16 bytes, whatever the length of the value.
constexpr std::size_t readable = 16;
constexpr std::size_t maxLength = std::numeric_limits<std::int16_t>::max();

std::string numberValue(std::int64_t number) {
    std::string value(sizeof number, '\0');
    std::memcpy(value.data(), &number, sizeof number);
    return value;
}

std::string joined(const std::vector<std::string>& values) {
    std::string result;
    const char* separator = "";
    for (const std::string& value : values) {
        result.append(separator).append(value);
        separator = "\n";
    }
    return result;
}

std::int16_t typeOf(const Condition& condition) {
    if (condition.isNumber && condition.isOnField()) {
        return SEL1_DECIMAL;
    }
    return condition.isNumber && condition.op != INTF_IN ? SEL1_INTEGER : SEL1_CHARACTER;
}

/// The bytes that a condition compares; a text ends at its first NUL.
std::string valueOf(const Condition& condition) {
    if (typeOf(condition) == SEL1_INTEGER) {
        return numberValue(condition.number);
    }
    std::string value = condition.op == INTF_IN ? joined(condition.values) : condition.text;
    value.resize(std::min(std::strlen(value.c_str()), maxLength));
    return value;
}

} // namespace

FilterList::FilterList(const std::vector<Condition>& conditions) {
    // The filters point into the values, so these must not move.
    m_values.reserve(conditions.size());
    m_filters.reserve(conditions.size());
    for (const Condition& condition : conditions) {
        std::string& value = m_values.emplace_back(valueOf(condition));
        const auto length = static_cast<std::int16_t>(value.size());
        // Padded with NULs: ColumnIsException gets a value without its length.
        value.resize(std::max(value.size(), readable));
        m_filters.push_back(
            {condition.column.c_str(), condition.op, typeOf(condition), length, value.c_str()});
    }
}

SEL1_FILTERINFO* FilterList::next() noexcept {
    return m_position < m_filters.size() ? &m_filters[m_position++] : nullptr;
}

} // namespace zrm::host
