#ifndef ZRM_HOST_COLUMNS_H
#define ZRM_HOST_COLUMNS_H

#include <span>
#include <string_view>

namespace zrm::host {

/// What conditions need to know about a column before the agent registers its tables.
struct Column {
    std::string_view name; ///< upper-case
    int width;             ///< bytes
    bool isNumber;         ///< an integer column; false: a character column
    bool isTime;           ///< holds a 16-character time stamp
    bool isUtf8 = false;   ///< UTF-8, whatever the code page of the log
};

/// The columns of a table ("RMLOGENT", "RMMONLOG") in table order; empty for any other name.
std::span<const Column> columnsOf(std::string_view table) noexcept;

/// The column of this upper-case name, or null.
const Column* findColumn(std::span<const Column> columns, std::string_view name) noexcept;

} // namespace zrm::host

#endif
