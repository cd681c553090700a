#ifndef ZRM_HOST_ROW_LAYOUT_H
#define ZRM_HOST_ROW_LAYOUT_H

#include "framework/filters.h"

#include <cstddef>
#include <cstdint>
#include <string>
#include <string_view>
#include <vector>

class ctreq;

namespace zrm::host {

/// One column of a table's rows.
struct RowColumn {
    std::string name; ///< upper-case, as in conditions and output
    std::size_t offset;
    std::size_t width;
    ColumnType type;

    bool isInteger() const noexcept { return type == COLUMN_INTEGER; }
    /// The value of an integer column.
    std::int32_t integer(const char* row) const noexcept;
    /// The text of a character column without its padding; a view into the row.
    std::string_view text(const char* row) const noexcept;
};

/// The columns of a table in table order, obtained from one of its requests. Immutable, so any
/// thread; independent of the request once built.
class RowLayout {
public:
    explicit RowLayout(ctreq& request);

    const std::vector<RowColumn>& columns() const noexcept { return m_columns; }
    /// The column of this upper-case name; null when there is none.
    const RowColumn* find(std::string_view name) const noexcept;

private:
    std::vector<RowColumn> m_columns;
};

} // namespace zrm::host

#endif
