#ifndef ZRM_HOST_COLUMN_TEXTS_H
#define ZRM_HOST_COLUMN_TEXTS_H

#include "host/base/Result.h"
#include "host/formats/EntryColumn.h"
#include "logs/EntryFormat.h"

#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

struct FormatDescription;

/// What the columns show instead of some texts of the log (`values`), and where the entry has
/// nothing for them (`defaults`). Not changed after it was made; any thread.
class ColumnTexts {
public:
    /// Refuses names that are not columns, and the time.
    static Result<ColumnTexts> make(const FormatDescription& description);

    /// Exchanges texts first, then fills the columns that are empty. Allocates nothing. The texts
    /// are valid as long as the object.
    void apply(EntryColumns& columns) const noexcept;

    /// True if `values` has the column.
    bool exchanges(EntryColumn column) const noexcept;

private:
    struct Column {
        EntryColumn column;
        std::vector<std::pair<std::string, std::string>> exchanged; ///< in the order of the first
        std::string filled;
    };

    Column& of(EntryColumn column);

    std::vector<Column> m_columns; ///< those with such texts
};

} // namespace zrm::host

#endif
