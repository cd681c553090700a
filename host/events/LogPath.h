#ifndef ZRM_HOST_LOG_PATH_H
#define ZRM_HOST_LOG_PATH_H

#include "host/framework/RowLayout.h"

#include <string>

namespace zrm::host {

/// The whole path of the log of a row, of either table. Any thread.
class LogPath {
public:
    /// Appends the directory and the name, as UTF-8; the columns that keep their own code page
    /// serve where the UTF-8 ones are empty.
    static void append(std::string& text, const RowLayout& layout, const char* row);

    /// The same as a text of its own.
    static std::string of(const RowLayout& layout, const char* row);
};

} // namespace zrm::host

#endif
