#include "host/config/EntryNames.h"

#include "base/EntryFields.h"
#include "host/config/Columns.h"
#include "host/framework/Operators.h"

#include <algorithm>
#include <iterator>
#include <optional>

#include <re2/re2.h>

namespace zrm::host {

namespace {

constexpr std::string_view table = "RMLOGENT";

bool isSameLetter(char left, char right) noexcept {
    const auto upper = [](char c) {
        return c >= 'a' && c <= 'z' ? static_cast<char>(c - 'a' + 'A') : c;
    };
    return upper(left) == upper(right);
}

/// The place of a column in its table, whatever the case of the name.
std::optional<std::size_t> columnPlace(std::string_view name) {
    const auto columns = columnsOf(table);
    const auto found = std::find_if(columns.begin(), columns.end(), [&](const Column& column) {
        return std::equal(column.name.begin(), column.name.end(), name.begin(), name.end(),
                          &isSameLetter);
    });
    return found == columns.end()
               ? std::nullopt
               : std::optional(static_cast<std::size_t>(found - columns.begin()));
}

/// Most patterns have no names, and these need not be compiled.
bool mayHaveNames(std::string_view pattern) {
    return pattern.find("(?P<") != pattern.npos || pattern.find("(?<") != pattern.npos;
}

EntryName ofField(std::string_view field) {
    EntryName name;
    name.kind = EntryName::Kind::field;
    name.field = field;
    return name;
}

EntryName ofColumn(std::size_t place) {
    EntryName name;
    name.column = place;
    return name;
}

} // namespace

EntryNames::EntryNames(const std::vector<Condition>& conditions) {
    for (std::size_t index = 0; index < conditions.size(); ++index) {
        const Condition& condition = conditions[index];
        if (condition.op == INTF_MATCHES && mayHaveNames(condition.text)) {
            addCaptures(index, condition);
        }
        if (const auto field = fieldOf(condition.column)) {
            addField(*field);
        }
    }
}

void EntryNames::addCaptures(std::size_t index, const Condition& condition) {
    const auto pattern = compiledPattern(condition.text, PatternText::utf8);
    if (!pattern->ok()) {
        return;
    }
    for (const auto& [group, name] : pattern->CapturingGroupNames()) {
        const auto isOfThatName = [&name = name](const Capture& one) { return one.name == name; };
        if (std::none_of(m_captures.begin(), m_captures.end(), isOfThatName)) {
            m_captures.push_back({name, index, group});
        }
    }
}

void EntryNames::addField(std::string_view field) {
    if (std::find(m_fields.begin(), m_fields.end(), field) == m_fields.end()) {
        m_fields.emplace_back(field);
    }
}

EntryName EntryNames::sourceOf(const Condition& condition) {
    const auto field = fieldOf(condition.column);
    return field ? ofField(*field) : ofColumn(columnPlace(condition.column).value_or(0));
}

Result<EntryName> EntryNames::find(std::string_view name) const {
    const auto capture = std::find_if(m_captures.begin(), m_captures.end(),
                                      [&](const Capture& one) { return one.name == name; });
    if (capture != m_captures.end()) {
        EntryName found;
        found.kind = EntryName::Kind::capture;
        found.condition = capture->condition;
        found.group = capture->group;
        return found;
    }
    if (const auto column = columnPlace(name)) {
        return ofColumn(*column);
    }
    if (const auto field = fieldOf(name)) {
        if (field->empty() || field->size() > EntryFields::longestName) {
            return refused("'" + std::string(name) + "' does not name a field",
                           "write field. and a name of 1 to 255 bytes");
        }
        return ofField(*field);
    }
    if (std::find(m_fields.begin(), m_fields.end(), name) != m_fields.end()) {
        return ofField(name);
    }
    return refused("'" + std::string(name) + "' is not a name of this situation",
                   "the names are " + known());
}

/// All names, for people.
std::string EntryNames::known() const {
    std::string names;
    for (const Capture& capture : m_captures) {
        names += capture.name + ", ";
    }
    for (const std::string& field : m_fields) {
        names += "field." + field + ", ";
    }
    for (const Column& column : columnsOf(table)) {
        names += std::string(column.name) + ", ";
    }
    names += m_captures.empty()
                 ? "field.NAME for a field of the entry, and NAME for what a matches "
                   "condition captures with (?P<NAME>...)"
                 : "and field.NAME for a field of the entry";
    return names;
}

} // namespace zrm::host
