#include "host/framework/CompiledCondition.h"

#include "base/TraceScope.h"
#include "framework/ctreq.h"
#include "framework/filters.h"
#include "host/base/Utf8.h"
#include "host/framework/ColumnText.h"
#include "host/framework/Condition.h"
#include "host/framework/FieldCondition.h"
#include "host/framework/Operators.h"

#include <algorithm>
#include <charconv>
#include <cstdint>
#include <cstring>
#include <optional>
#include <string_view>
#include <utility>

#include <string.h>

#include <re2/re2.h>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"CompiledCondition.cpp"};

/// Parses a number: decimal digits with an optional minus sign and nothing else.
std::optional<std::int64_t> numberOf(std::string_view text) noexcept {
    std::int64_t value = 0;
    const char* const end = text.data() + text.size();
    const auto result = std::from_chars(text.data(), end, value);
    if (result.ec != std::errc() || result.ptr != end) {
        return std::nullopt;
    }
    return value;
}

/// The columns that name a log. Most situations are for one log, and most rows come from others;
/// names differ more than directories.
constexpr std::pair<std::string_view, int> logColumns[] = {
    {"LOGNAME", 1}, {"ULOGNAME", 1}, {"LOGPATH", 2}, {"ULOGPATH", 2}};

/// 0 for columns that do not name a log.
int logRank(std::string_view column) {
    for (const auto& [name, rank] : logColumns) {
        if (column == name) {
            return rank;
        }
    }
    return 0;
}

/// The part of a value that a column of this width can hold.
std::string_view cut(std::string_view value, const RowColumn& column) {
    return column.type == COLUMN_UTF8 ? Utf8::prefix(value, column.width)
                                      : value.substr(0, column.width);
}

} // namespace

CompiledCondition::CompiledCondition(const SEL1_FILTERINFO& filter, const RowColumn* column)
    : m_op(filter.compareOperator), m_value(textOf(filter)), m_filter(&filter) {
    if (const auto field = fieldOf(filter.columnName); column == nullptr && field) {
        m_field = std::make_unique<FieldCondition>(*field, filter);
        m_kind = Kind::FIELD;
    } else if (column == nullptr) {
        m_kind = Kind::FOREIGN;
    } else {
        m_offset = column->offset;
        m_width = column->width;
        if (column->isInteger()) {
            compileInteger(filter);
        } else {
            compileText(*column);
        }
    }
    m_isOnLog = column != nullptr && !column->isInteger() && logRank(column->name) != 0;
    m_rank = rankOf(column);
}

CompiledCondition::CompiledCondition(CompiledCondition&&) noexcept = default;
CompiledCondition& CompiledCondition::operator=(CompiledCondition&&) noexcept = default;
CompiledCondition::~CompiledCondition() = default;

void CompiledCondition::compileInteger(const SEL1_FILTERINFO& filter) {
    if (m_op == INTF_IN) {
        for (const std::string_view text : linesOf(m_value)) {
            if (const auto number = numberOf(text)) {
                m_numbers.push_back(*number);
            }
        }
        m_kind = Kind::INTEGER_IN;
        return;
    }
    if (!isRelational(m_op)) {
        return;
    }
    if (filter.dataType == SEL1_INTEGER) {
        std::memcpy(&m_number, filter.value, sizeof m_number);
        m_kind = Kind::INTEGER;
    } else if (const auto number = numberOf(m_value)) {
        m_number = *number;
        m_kind = Kind::INTEGER;
    }
}

void CompiledCondition::compileText(const RowColumn& column) {
    if (m_filter->dataType == SEL1_INTEGER) {
        return;
    }
    if (isRelational(m_op)) {
        m_value = ColumnText::withoutTrailingBlanks(cut(m_value, column));
        m_kind = m_op == INTF_EQUAL ? Kind::TEXT_EQUAL : Kind::TEXT_ORDER;
    } else if (m_op == INTF_IN) {
        for (const std::string_view text : linesOf(m_value)) {
            m_values.push_back(ColumnText::withoutTrailingBlanks(cut(text, column)));
        }
        m_kind = Kind::TEXT_IN;
    } else if (m_op == INTF_STARTS) {
        m_kind = Kind::STARTS;
    } else if (m_op == INTF_CONTAINS) {
        m_kind = Kind::CONTAINS;
    } else if (m_op == INTF_MATCHES) {
        compilePattern(column);
    }
}

void CompiledCondition::compilePattern(const RowColumn& column) {
    TraceScope trace(anchor);
    m_pattern = compiledPattern(m_value, patternTextOf(column.type == COLUMN_UTF8, m_value));
    if (m_pattern->ok()) {
        m_kind = Kind::MATCHES;
    } else {
        trace.error()("Pattern %.*s for column %s cannot be used: %s.",
                      static_cast<int>(m_value.size()), m_value.data(), column.name.c_str(),
                      m_pattern->error().c_str());
    }
}

int CompiledCondition::rankOf(const RowColumn* column) const noexcept {
    if (m_kind == Kind::TEXT_EQUAL) {
        if (const int rank = logRank(column->name)) {
            return rank;
        }
    }
    // The kinds are ordered by cost; a condition that never holds makes all others unnecessary.
    return m_kind == Kind::NEVER ? 0 : 2 + static_cast<int>(m_kind);
}

bool CompiledCondition::holds(ctreq* request, char* row) const {
    const char* const field = row + m_offset;
    std::int32_t number;
    switch (m_kind) {
    case Kind::NEVER:
        return false;
    case Kind::INTEGER:
        std::memcpy(&number, field, sizeof number);
        return compares(m_op, orderOf<std::int64_t>(number, m_number));
    case Kind::INTEGER_IN:
        std::memcpy(&number, field, sizeof number);
        return std::find(m_numbers.begin(), m_numbers.end(), number) != m_numbers.end();
    case Kind::TEXT_EQUAL:
        return isEqual(field);
    case Kind::TEXT_ORDER:
        return compares(m_op, ColumnText::compare(field, m_width, m_value));
    case Kind::TEXT_IN:
        return isOneOf(field);
    case Kind::STARTS:
        return startsWith(field);
    case Kind::CONTAINS:
        return contains(field);
    case Kind::MATCHES:
        return matches(field);
    case Kind::FIELD:
        return m_field->holds();
    case Kind::FOREIGN:
        return request->ColumnIsException(row, const_cast<char*>(m_filter->columnName), m_op,
                                          const_cast<char*>(m_filter->value)) != 0;
    }
    return false;
}

bool CompiledCondition::isOnText() const noexcept {
    switch (m_kind) {
    case Kind::TEXT_EQUAL:
    case Kind::TEXT_ORDER:
    case Kind::TEXT_IN:
    case Kind::STARTS:
    case Kind::CONTAINS:
        return true;
    default:
        return false;
    }
}

std::string_view CompiledCondition::prefix() const noexcept {
    return m_kind == Kind::TEXT_EQUAL || m_kind == Kind::STARTS ? m_value : std::string_view();
}

bool CompiledCondition::holdsFor(const char* row, std::string_view text) const noexcept {
    switch (m_kind) {
    case Kind::TEXT_EQUAL:
        return text == m_value;
    case Kind::TEXT_ORDER:
        return compares(m_op, ColumnText::compare(row + m_offset, m_width, m_value));
    case Kind::TEXT_IN:
        return std::find(m_values.begin(), m_values.end(), text) != m_values.end();
    case Kind::STARTS:
        return startsWith(row + m_offset);
    case Kind::CONTAINS:
        return memmem(text.data(), text.size(), m_value.data(), m_value.size()) != nullptr;
    default:
        return true;
    }
}

bool CompiledCondition::isEqual(const char* field) const noexcept {
    // The value contains no NUL, so if the bytes are equal, the field's text is at least as long.
    const std::size_t length = m_value.size();
    return std::memcmp(field, m_value.data(), length) == 0 &&
           ColumnText::isPadding(field + length, m_width - length);
}

bool CompiledCondition::startsWith(const char* field) const noexcept {
    const std::size_t length = m_value.size();
    if (length > m_width || std::memcmp(field, m_value.data(), length) != 0) {
        return false;
    }
    // Padding must not match a value that ends in a blank.
    return length == 0 || m_value.back() != ' ' ||
           ColumnText::unpadded(field, m_width).size() >= length;
}

bool CompiledCondition::contains(const char* field) const noexcept {
    const std::string_view text = ColumnText::unpadded(field, m_width);
    return memmem(text.data(), text.size(), m_value.data(), m_value.size()) != nullptr;
}

bool CompiledCondition::isOneOf(const char* field) const noexcept {
    const std::string_view text = ColumnText::unpadded(field, m_width);
    return std::find(m_values.begin(), m_values.end(), text) != m_values.end();
}

bool CompiledCondition::matches(const char* field) const {
    const std::string_view text = ColumnText::unpadded(field, m_width);
    return m_pattern->Match(re2::StringPiece(text.data(), text.size()), 0, text.size(),
                            re2::RE2::UNANCHORED, nullptr, 0);
}

} // namespace zrm::host
