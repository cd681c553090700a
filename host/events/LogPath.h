#ifndef ZRM_HOST_LOG_PATH_H
#define ZRM_HOST_LOG_PATH_H

#include "host/framework/RowLayout.h"

#include <string>

namespace zrm::host {

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
