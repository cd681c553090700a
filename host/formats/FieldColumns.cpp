#include "host/formats/FieldColumns.h"

#include "base/EntryFields.h"
#include "host/formats/FormatDescription.h"
#include "host/formats/TimePattern.h"

#include <utility>

namespace zrm::host {

Result<FieldColumns> FieldColumns::make(const FormatDescription& description) {
    for (const auto& [name, field] : description.columns) {
        if (auto column = columnNamed(name, "columns"); !column) {
            return tl::unexpected(std::move(column.error()));
        }
        if (field.size() > EntryFields::longestName) {
            return refused("the name of a field has at most 255 bytes", "", "columns." + name);
        }
    }
    auto texts = ColumnTexts::make(description);
    if (!texts) {
        return tl::unexpected(std::move(texts.error()));
    }
    auto times = TimePattern::compile(description.timeFormat);
    if (!times) {
        return tl::unexpected(std::move(times.error()));
    }
    return FieldColumns(description, std::move(*texts), std::move(*times));
}

FieldColumns::FieldColumns(const FormatDescription& description, ColumnTexts texts,
                           std::shared_ptr<const TimePattern> times)
    : m_names(description.columns), m_texts(std::move(texts)), m_times(std::move(times)) {}

bool FieldColumns::fill(const JsonColumns& found, TimeMemo& times, EntryColumns& columns) noexcept {
    columns.system = found.of(EntryColumn::system).value;
    columns.source = found.of(EntryColumn::source).value;
    columns.type = found.of(EntryColumn::type).value;
    columns.entryClass = found.of(EntryColumn::entryClass).value;
    columns.description = found.of(EntryColumn::description).value;
    bool isTime = found.begin() == found.end();
    for (const JsonCandidate& candidate : found) {
        isTime = times.read(candidate.value, columns) || isTime;
        if (columns.hasTime) { // a time of day alone may be a duration
            break;
        }
    }
    return isTime;
}

void FieldColumns::complete(std::string_view entry, EntryColumns& columns) const noexcept {
    m_texts.apply(columns);
    if (columns.description.empty()) {
        columns.description = entry;
    }
}

} // namespace zrm::host
