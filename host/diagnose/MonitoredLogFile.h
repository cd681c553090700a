#ifndef ZRM_HOST_MONITORED_LOG_FILE_H
#define ZRM_HOST_MONITORED_LOG_FILE_H

#include "monitor/FileIdentity.h"

#include <optional>
#include <string>

namespace zrm::host {

/// The file of a monitored log, opened for examination. The log's name may by now lead to another
/// file: its successor after a rotation, or anything if the name has become a link. Opens only the
/// file that the monitor has open; while it has none, the file of this name unless that is a link.
class MonitoredLogFile {
public:
    /// `path` is the log's local name, `monitored` the file that its monitor has open. Never waits,
    /// whatever is in the file's place.
    MonitoredLogFile(const std::string& path, const std::optional<FileIdentity>& monitored);
    ~MonitoredLogFile();
    MonitoredLogFile(const MonitoredLogFile&) = delete;
    MonitoredLogFile& operator=(const MonitoredLogFile&) = delete;

    /// Why the file cannot be read, as a clause; empty when it is open.
    const std::string& problem() const noexcept { return m_problem; }
    /// The open file, at its beginning; this object closes it.
    int descriptor() const noexcept { return m_descriptor; }

private:
    int m_descriptor;
    std::string m_problem;
};

} // namespace zrm::host

#endif
