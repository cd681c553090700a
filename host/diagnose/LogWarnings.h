#ifndef ZRM_HOST_LOG_WARNINGS_H
#define ZRM_HOST_LOG_WARNINGS_H

#include "host/diagnose/LogLedgers.h"

#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

/// What an operator should know about a log that is monitored without an error. Stateless; any
/// thread.
class LogWarnings {
public:
    /// Looks at the log's name and, for an accounting log, at its file. May wait for the file
    /// system.
    static std::vector<LogWarning> of(const LogLedgerView& log);

    // For a file that is to be monitored. None when nothing is wrong or the file cannot be read.

    /// Why a file is not one of login accounting records of 40 bytes; `opened` is the file that a
    /// monitor reads.
    static std::optional<std::string>
    ofAccountingFile(const std::string& path,
                     const std::optional<FileIdentity>& opened = std::nullopt);
    /// Why a file is not a syslog file: none of its last lines has a time.
    static std::optional<std::string> ofSyslogFile(const std::string& path);
};

} // namespace zrm::host

#endif
