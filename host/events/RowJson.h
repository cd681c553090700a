#ifndef ZRM_HOST_ROW_JSON_H
#define ZRM_HOST_ROW_JSON_H

#include "host/framework/RowLayout.h"

#include <string>
#include <string_view>

namespace zrm::host {

/// Writes rows as JSON, fast enough for every event. Any thread.
class RowJson {
public:
    /// Appends one row as an object: the columns under their upper-case names in table order,
    /// character columns as returned by RowText, integers as numbers.
    static void append(std::string& out, const RowLayout& layout, const char* row);

    /// Appends a text as a JSON string; bytes that are not UTF-8 become U+FFFD.
    static void appendText(std::string& out, std::string_view text);
};

} // namespace zrm::host

#endif
