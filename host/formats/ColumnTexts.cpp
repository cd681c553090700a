#include "host/formats/ColumnTexts.h"

#include "host/formats/FormatDescription.h"

#include <algorithm>
#include <string_view>

namespace zrm::host {

namespace {

/// `key` is the key that names the column: "defaults" or "values".
Result<EntryColumn> textColumn(const std::string& name, const std::string& key) {
    Result<EntryColumn> column = columnNamed(name, key);
    if (column == EntryColumn::time) {
        return refused("the time of an entry cannot be given here", "name one of the other columns",
                       key + "." + name);
    }
    return column;
}

} // namespace

Result<ColumnTexts> ColumnTexts::make(const FormatDescription& description) {
    ColumnTexts texts;
    for (const auto& [name, text] : description.defaults) {
        const Result<EntryColumn> column = textColumn(name, "defaults");
        if (!column) {
            return tl::unexpected(column.error());
        }
        texts.of(*column).filled = text;
    }
    for (const auto& [name, exchanged] : description.values) {
        const Result<EntryColumn> column = textColumn(name, "values");
        if (!column) {
            return tl::unexpected(column.error());
        }
        texts.of(*column).exchanged.assign(exchanged.begin(), exchanged.end());
    }
    return texts;
}

ColumnTexts::Column& ColumnTexts::of(EntryColumn column) {
    const auto found = std::find_if(m_columns.begin(), m_columns.end(),
                                    [column](const Column& one) { return one.column == column; });
    return found == m_columns.end() ? m_columns.emplace_back(Column{column, {}, {}}) : *found;
}

bool ColumnTexts::exchanges(EntryColumn column) const noexcept {
    return std::any_of(m_columns.begin(), m_columns.end(), [column](const Column& one) {
        return one.column == column && !one.exchanged.empty();
    });
}

void ColumnTexts::apply(EntryColumns& columns) const noexcept {
    for (const Column& column : m_columns) {
        std::string_view& text = *textOf(columns, column.column);
        const auto found = std::lower_bound(
            column.exchanged.begin(), column.exchanged.end(), text,
            [](const auto& pair, std::string_view wanted) { return pair.first < wanted; });
        if (found != column.exchanged.end() && found->first == text) {
            text = found->second;
        }
        if (text.empty()) {
            text = column.filled;
        }
    }
}

} // namespace zrm::host
