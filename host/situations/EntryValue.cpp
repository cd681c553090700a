#include "host/situations/EntryValue.h"

#include "base/EntryFields.h"
#include "framework/LogEntry.h"
#include "host/config/Columns.h"
#include "host/framework/Operators.h"

#include <algorithm>
#include <charconv>
#include <iterator>
#include <limits>
#include <utility>

#include <re2/re2.h>

namespace zrm::host {

/// The pattern of a `matches` condition, whose captures are read.
class CapturePattern {
public:
    CapturePattern(std::size_t condition, EntryName source, std::unique_ptr<re2::RE2> pattern)
        : m_condition(condition), m_source(std::move(source)), m_pattern(std::move(pattern)) {}

    bool isOf(std::size_t condition) const noexcept { return m_condition == condition; }
    /// Of its condition: a column or a field.
    const EntryName& source() const noexcept { return m_source; }
    /// The highest group that is read decides what a match costs.
    void need(int group) noexcept { m_groups = std::max(m_groups, group + 1); }

    /// Sets the groups, which have no data where they take no part.
    void match(std::string_view text, std::vector<re2::StringPiece>& groups) const {
        groups.assign(static_cast<std::size_t>(m_groups), re2::StringPiece());
        if (!m_pattern->Match(re2::StringPiece(text.data(), text.size()), 0, text.size(),
                              re2::RE2::UNANCHORED, groups.data(), m_groups)) {
            groups.assign(groups.size(), re2::StringPiece());
        }
    }

private:
    const std::size_t m_condition;
    const EntryName m_source;
    const std::unique_ptr<re2::RE2> m_pattern;
    int m_groups = 1; ///< also the whole match
};

/// What a pattern has captured from the reading's entry.
struct EntryReading::Match {
    const CapturePattern* pattern;
    std::vector<re2::StringPiece> groups;
};

EntryReading::EntryReading() = default;
EntryReading::~EntryReading() = default;

void EntryReading::begin(const RowLayout& layout, const char* row, LogEntry* entry) noexcept {
    m_layout = &layout;
    m_row = row;
    m_entry = entry;
    m_matched = 0;
}

std::string_view EntryReading::field(std::string_view name) const {
    const std::string_view* const value =
        m_entry == nullptr ? nullptr : m_entry->fields().find(name);
    return value == nullptr ? std::string_view() : *value;
}

const EntryReading::Match& EntryReading::match(const CapturePattern& pattern) {
    for (std::size_t index = 0; index < m_matched; ++index) {
        if (m_matches[index].pattern == &pattern) {
            return m_matches[index];
        }
    }
    if (m_matched == m_matches.size()) {
        m_matches.emplace_back();
    }
    Match& match = m_matches[m_matched++];
    const EntryName& source = pattern.source();
    match.pattern = &pattern;
    pattern.match(source.kind == EntryName::Kind::field ? field(source.field)
                                                        : column(source.column).text(m_row),
                  match.groups);
    return match;
}

std::string_view EntryValue::read(EntryReading& reading, std::string& room) const {
    if (m_name.kind == EntryName::Kind::field) {
        return reading.field(m_name.field);
    }
    if (m_name.kind == EntryName::Kind::capture) {
        const auto group = static_cast<std::size_t>(m_name.group);
        const re2::StringPiece& piece = reading.match(*m_pattern).groups[group];
        return {piece.data(), piece.size()};
    }
    const RowColumn& column = reading.column(m_name.column);
    if (!column.isInteger()) {
        return column.text(reading.m_row);
    }
    char digits[std::numeric_limits<std::int32_t>::digits10 + 2];
    const auto end = std::to_chars(digits, std::end(digits), column.integer(reading.m_row));
    room.assign(digits, end.ptr);
    return room;
}

EntryValues::EntryValues(const std::vector<Condition>& conditions)
    : m_conditions(conditions), m_names(conditions) {}

EntryValues::~EntryValues() = default;

Result<EntryValue> EntryValues::compile(std::string_view name) {
    Result<EntryName> found = m_names.find(name);
    if (!found) {
        return tl::unexpected(found.error());
    }
    if (found->kind != EntryName::Kind::capture) {
        return EntryValue(std::move(*found), nullptr);
    }
    auto pattern = std::find_if(m_patterns.begin(), m_patterns.end(),
                                [&](const auto& known) { return known->isOf(found->condition); });
    if (pattern == m_patterns.end()) {
        const Condition& condition = m_conditions[found->condition];
        EntryName source = EntryNames::sourceOf(condition);
        const bool isUtf8 =
            source.kind == EntryName::Kind::field || columnsOf("RMLOGENT")[source.column].isUtf8;
        m_patterns.push_back(std::make_shared<CapturePattern>(
            found->condition, std::move(source),
            compiledPattern(condition.text, patternTextOf(isUtf8, condition.text))));
        pattern = std::prev(m_patterns.end());
    }
    (*pattern)->need(found->group);
    return EntryValue(std::move(*found), *pattern);
}

} // namespace zrm::host
