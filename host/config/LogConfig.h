#ifndef ZRM_HOST_LOG_CONFIG_H
#define ZRM_HOST_LOG_CONFIG_H

#include "logs/FollowSettings.h"

#include <string>
#include <vector>

namespace zrm::host {

/// [[log]]
struct LogConfig {
    std::vector<std::string> paths;    ///< absolute; each a path or a glob
    std::vector<std::string> excludes; ///< globs of whole paths, or of file names (without a '/')
    char type = 'S';                   ///< the letter of the log configuration
    std::string format;                ///< of a text log; the command of an error log
    bool debug = false;
    FollowSettings follow; ///< isNewcomer is not set
    unsigned line = 0;     ///< of the table in the file

    /// The name of the type as the file has it.
    const char* typeName() const noexcept;

    bool operator==(const LogConfig&) const = default;
};

} // namespace zrm::host

#endif
