#ifndef ZRM_HOST_LOG_CONFIG_H
#define ZRM_HOST_LOG_CONFIG_H

#include "host/config/SourceConfig.h"
#include "host/formats/MessageFormat.h"
#include "logs/FollowSettings.h"

#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

/// [[log]]
struct LogConfig {
    std::vector<std::string> paths;    ///< absolute; each a path or a glob
    std::vector<std::string> excludes; ///< globs of whole paths, or of file names (without a '/')
    std::string type = "syslog";       ///< its name
    char letter = 'S';                 ///< the type as FurtherLog has it
    std::string format;                ///< of a text log; the command of an error log
    std::string formatName = "syslog"; ///< the ready formats as named, or the type
    std::string name;                  ///< of a log that is not a file
    std::optional<JournalConfig> journal;
    Defined<MessageFormat> messages; ///< of the journal; none: they are read as they are
    std::optional<CommandConfig> command;
    bool debug = false;
    FollowSettings follow; ///< isNewcomer is not set
    unsigned line = 0;     ///< of the table in the file

    /// True if the entries do not come from files.
    bool isSource() const noexcept { return journal || command; }

    bool operator==(const LogConfig&) const = default;
};

} // namespace zrm::host

#endif
