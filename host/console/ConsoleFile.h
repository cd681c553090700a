#ifndef ZRM_HOST_CONSOLE_FILE_H
#define ZRM_HOST_CONSOLE_FILE_H

#include <string_view>

namespace zrm::host {

/// A file of the console, as it is in the program. What it refers to lives as long as the process.
struct ConsoleFile {
    std::string_view name; ///< below /console/, for example views/logs.js
    std::string_view content;

    /// The file of a name; null when the console has none.
    static const ConsoleFile* find(std::string_view name);
};

} // namespace zrm::host

#endif
