#ifndef ZRM_HOST_COLUMNS_H
#define ZRM_HOST_COLUMNS_H

#include <span>
#include <string_view>

namespace zrm::host {

/// What conditions need to know of a column before the agent has registered its tables.
struct Column {
    std::string_view name; ///< upper-case
    int width;             ///< bytes
    bool isNumber;         ///< an integer column; otherwise a character column
    bool isTime;           ///< holds a 16-character time stamp
};

/// The columns of a table ("RMLOGENT", "RMMONLOG") in table order; none for another name.
std::span<const Column> columnsOf(std::string_view table) noexcept;

/// The column of this upper-case name, or null.
const Column* findColumn(std::span<const Column> columns, std::string_view name) noexcept;

} // namespace zrm::host

#endif
