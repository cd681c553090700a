#ifndef ZRM_HOST_ROW_TEXT_H
#define ZRM_HOST_ROW_TEXT_H

#include "host/framework/RowLayout.h"

#include <string>
#include <string_view>

namespace zrm::host {

/// Character columns as people and other systems read them. Any thread.
class RowText {
public:
    /// The column's text without padding, in valid UTF-8: a view into the row where it is that
    /// already, else into `room`, which is overwritten. Text that is not UTF-8 is taken to be in
    /// the process's code page, a column of type UTF-8 excepted; what is valid in neither is
    /// replaced by U+FFFD.
    static std::string_view of(const RowColumn& column, const char* row, std::string& room);
};

} // namespace zrm::host

#endif
