#ifndef ZRM_HOST_ROW_TEXT_H
#define ZRM_HOST_ROW_TEXT_H

#include "host/framework/RowLayout.h"

#include <string>
#include <string_view>

namespace zrm::host {

/// Character columns as text for people and other systems. Any thread.
class RowText {
public:
    /// The column's text without padding, in valid UTF-8: a view into the row if it is already
    /// valid, otherwise into `room`, which is overwritten. Text that is not UTF-8 is assumed to be
    /// in the process's code page, except in columns of type UTF-8; what is valid in neither
    /// becomes U+FFFD.
    static std::string_view of(const RowColumn& column, const char* row, std::string& room);

    /// The same for any text of a log.
    static std::string_view ofLocal(std::string_view text, std::string& room);
};

/// The full path of a row's log, for either table. Any thread.
class LogPath {
public:
    /// Appends the directory and the name as UTF-8. If the UTF-8 columns are empty, uses the ones
    /// in the log's own code page.
    static void append(std::string& text, const RowLayout& layout, const char* row);

    /// The same as a new text.
    static std::string of(const RowLayout& layout, const char* row);
};

} // namespace zrm::host

#endif
