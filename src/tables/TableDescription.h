#ifndef ZRM_TABLE_DESCRIPTION_H
#define ZRM_TABLE_DESCRIPTION_H

#include "framework/filters.h"

#include <cstddef>
#include <cstdint>
#include <span>
#include <string_view>

namespace zrm {

// Statuses that the tables return to the framework.
inline constexpr unsigned tableNoManager = 0x21060002;
inline constexpr unsigned tableNoSuchColumn = 0x21060007;
/// One column of a table's row record.
struct TableColumn {
    std::string_view name;    ///< upper-case name, used by conditions
    const char* internalName; ///< the name reported to the framework
    ColumnType type;
    std::size_t offset; ///< bytes from the row's start
    std::size_t width;  ///< bytes
};

/// A table as its request objects describe it to the framework. Constant data with static storage
/// duration.
struct TableDescription {
    const char* className; ///< the row holder class, printed at the top of a state dump
    std::span<const TableColumn> columns;
    unsigned rowSize;   ///< bytes
    unsigned allocSize; ///< rows to grow by when the data array is full

    int numColumns() const noexcept { return static_cast<int>(columns.size()); }

    /// The column with exactly this upper-case name, or null if there is none.
    const TableColumn* find(std::string_view name) const noexcept;

    /// Describes column `index` and returns 0. Returns tableNoSuchColumn if the index is out of
    /// range, but 0 for the one just past the last column. Both leave `info` unchanged.
    unsigned describe(ColumnInfo* info, int index) const noexcept;

    /// True if the columns, in order, cover the whole record: each begins where the previous one
    /// ends, integers at the next multiple of four.
    constexpr bool coversRow() const noexcept {
        constexpr std::size_t integerSize = sizeof(std::int32_t);
        std::size_t end = 0;
        for (const TableColumn& column : columns) {
            if (column.type == COLUMN_INTEGER) {
                end = (end + integerSize - 1) / integerSize * integerSize;
            }
            if (column.offset != end ||
                (column.type == COLUMN_INTEGER && column.width != integerSize)) {
                return false;
            }
            end += column.width;
        }
        return end == rowSize && end <= INT16_MAX;
    }
};

} // namespace zrm

#endif
