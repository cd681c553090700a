#ifndef ZRM_HOST_STORED_ROW_H
#define ZRM_HOST_STORED_ROW_H

#include "host/analysis/KeptEntry.h"
#include "host/framework/RowLayout.h"
#include "logs/zrm_rmlogent_data.h"

#include <optional>
#include <string>
#include <string_view>

namespace zrm::host {

/// Rebuilds Log Entries rows from the JSON of events. Stateless.
class StoredRow {
public:
    /// Fills a row with the columns of an event's JSON object; false when the text is not such an
    /// object. Missing columns become blank or 0.
    static bool fill(zrm_rmlogent_data_t& row, const RowLayout& layout, std::string_view event);

    /// The text of the entry in an event's JSON object; none if it has none.
    static std::optional<std::string> entryText(std::string_view event);

    /// The fields of the entry in an event's JSON object.
    static KeptEntry::Fields entryFields(std::string_view event);

    /// Whether two rows belong to the same entry, judging by the entry's own columns.
    static bool isSameEntry(const RowLayout& layout, const zrm_rmlogent_data_t& left,
                            const zrm_rmlogent_data_t& right);
};

} // namespace zrm::host

#endif
