#ifndef ZRM_HOST_FIELD_COLUMNS_H
#define ZRM_HOST_FIELD_COLUMNS_H

#include "host/base/Result.h"
#include "host/formats/ColumnTexts.h"
#include "host/formats/JsonNames.h"
#include "logs/EntryFormat.h"

#include <memory>
#include <string_view>

namespace zrm::host {

struct FormatDescription;
class TimeMemo;
class TimePattern;

/// How fields that have names fill the columns of an entry. Not changed after it was made; any
/// thread.
class FieldColumns {
public:
    /// Refuses columns that there are not, names of fields that are too long, and what ColumnTexts
    /// and TimePattern refuse.
    static Result<FieldColumns> make(const FormatDescription& description);

    const JsonNames& names() const noexcept { return m_names; }
    /// True if the description says what to show instead of texts of this column.
    bool exchanges(EntryColumn column) const noexcept { return m_texts.exchanges(column); }

    /// What reads the times.
    const std::shared_ptr<const TimePattern>& times() const noexcept { return m_times; }

    /// Fills the columns with what was found, the time by `times`. False if there are fields for
    /// the time, but none is one.
    static bool fill(const JsonColumns& found, TimeMemo& times, EntryColumns& columns) noexcept;
    /// Exchanges texts and fills what is empty, the description with the entry.
    void complete(std::string_view entry, EntryColumns& columns) const noexcept;

private:
    FieldColumns(const FormatDescription& description, ColumnTexts texts,
                 std::shared_ptr<const TimePattern> times);

    JsonNames m_names;
    ColumnTexts m_texts;
    std::shared_ptr<const TimePattern> m_times;
};

} // namespace zrm::host

#endif
