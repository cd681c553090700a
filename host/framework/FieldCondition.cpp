#include "host/framework/FieldCondition.h"

#include "base/EntryFields.h"
#include "base/TraceScope.h"
#include "framework/LogEntry.h"
#include "host/framework/Condition.h"
#include "host/framework/FilterList.h"
#include "host/framework/Operators.h"

#include <algorithm>
#include <charconv>
#include <system_error>

#include <string.h>

#include <re2/re2.h>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"FieldCondition.cpp"};

template <typename Number> bool readWhole(std::string_view text, Number& number) noexcept {
    const char* const end = text.data() + text.size();
    const auto result = std::from_chars(text.data(), end, number);
    return result.ec == std::errc() && result.ptr == end;
}

} // namespace

std::optional<FieldNumber> FieldNumber::of(std::string_view text) noexcept {
    FieldNumber number;
    if (readWhole(text, number.m_whole)) {
        number.m_isWhole = true;
        return number;
    }
    // The library also reads "inf" and "nan".
    constexpr std::string_view characters = "0123456789.-+eE";
    if (text.find_first_not_of(characters) == text.npos && readWhole(text, number.m_value)) {
        return number;
    }
    return std::nullopt;
}

int FieldNumber::order(const FieldNumber& other) const noexcept {
    if (m_isWhole && other.m_isWhole) {
        return orderOf(m_whole, other.m_whole);
    }
    const auto valueOf = [](const FieldNumber& number) {
        return number.m_isWhole ? static_cast<long double>(number.m_whole) : number.m_value;
    };
    return orderOf(valueOf(*this), valueOf(other));
}

FieldCondition::FieldCondition(std::string_view field, const SEL1_FILTERINFO& filter)
    : m_field(field), m_op(filter.compareOperator), m_isNumber(filter.dataType == SEL1_DECIMAL) {
    TraceScope trace(anchor);
    const std::string_view value = textOf(filter);
    if (m_op == INTF_MATCHES) {
        m_pattern = compiledPattern(value, PatternText::utf8);
        m_isUsable = m_pattern->ok();
        if (!m_isUsable) {
            trace.error()("Pattern %.*s for field %.*s cannot be used: %s.",
                          static_cast<int>(value.size()), value.data(),
                          static_cast<int>(field.size()), field.data(), m_pattern->error().c_str());
        }
        return;
    }
    m_values = m_op == INTF_IN ? linesOf(value) : std::vector{value};
    if (m_isNumber) {
        for (const std::string_view text : m_values) {
            const std::optional<FieldNumber> number = FieldNumber::of(text);
            m_isUsable = m_isUsable && number;
            m_numbers.push_back(number.value_or(FieldNumber()));
        }
    }
}

FieldCondition::~FieldCondition() = default;

std::optional<std::string_view> FieldCondition::value() const {
    LogEntry* const entry = LogEntry::ofThisThread;
    const std::string_view* const value =
        entry == nullptr ? nullptr : entry->fields().find(m_field);
    return value == nullptr ? std::nullopt : std::optional(*value);
}

bool FieldCondition::holds() const {
    if (!m_isUsable) {
        return false;
    }
    const std::optional<std::string_view> value = this->value();
    if (!value) {
        return m_op == INTF_NOT_EQUAL;
    }
    if (!m_isNumber) {
        return isMetBy(*value);
    }
    const std::optional<FieldNumber> number = FieldNumber::of(*value);
    return number ? isMetBy(*number) : m_op == INTF_NOT_EQUAL;
}

bool FieldCondition::isMetBy(std::string_view value) const {
    if (m_op == INTF_MATCHES) {
        return m_pattern->Match(re2::StringPiece(value.data(), value.size()), 0, value.size(),
                                re2::RE2::UNANCHORED, nullptr, 0);
    }
    if (m_op == INTF_IN) {
        return std::find(m_values.begin(), m_values.end(), value) != m_values.end();
    }
    const std::string_view wanted = m_values.front();
    if (m_op == INTF_CONTAINS) {
        return memmem(value.data(), value.size(), wanted.data(), wanted.size()) != nullptr;
    }
    if (m_op == INTF_STARTS) {
        return value.starts_with(wanted);
    }
    return compares(m_op, value.compare(wanted));
}

bool FieldCondition::isMetBy(const FieldNumber& number) const {
    if (m_op == INTF_IN) {
        return std::any_of(m_numbers.begin(), m_numbers.end(),
                           [&](const FieldNumber& one) { return number.order(one) == 0; });
    }
    return compares(m_op, number.order(m_numbers.front()));
}

} // namespace zrm::host
