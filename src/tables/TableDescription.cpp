#include "tables/TableDescription.h"

namespace zrm {

const TableColumn* TableDescription::find(std::string_view name) const noexcept {
    for (const TableColumn& column : columns) {
        if (column.name == name) {
            return &column;
        }
    }
    return nullptr;
}

unsigned TableDescription::describe(ColumnInfo* info, int index) const noexcept {
    // The framework probes one past the last column to find the end. That is not an error.
    if (index < 0 || index > numColumns()) {
        return tableNoSuchColumn;
    }
    if (index < numColumns()) {
        const TableColumn& column = columns[static_cast<std::size_t>(index)];
        info->name = column.internalName;
        info->offset = static_cast<std::int16_t>(column.offset);
        info->length = static_cast<std::int16_t>(column.width);
        info->type = column.type;
    }
    return 0;
}

} // namespace zrm
