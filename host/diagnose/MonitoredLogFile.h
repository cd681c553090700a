#ifndef ZRM_HOST_MONITORED_LOG_FILE_H
#define ZRM_HOST_MONITORED_LOG_FILE_H

#include "host/base/Result.h"
#include "monitor/FileIdentity.h"

#include <optional>
#include <string>
#include <utility>

namespace zrm::host {

/// The file of a monitored log, opened for examination. The log's name may by now lead to another
/// file: its successor after a rotation, or anything if the name has become a link. Opens only the
/// file that the monitor has open; while it has none, the file of this name unless that is a link.
class MonitoredLogFile {
public:
    /// `path` is the log's local name, `monitored` the file that its monitor has open. Never waits,
    /// whatever is in the file's place.
    static Result<MonitoredLogFile> open(const std::string& path,
                                         const std::optional<FileIdentity>& monitored);
    ~MonitoredLogFile();
    MonitoredLogFile(MonitoredLogFile&& other) noexcept
        : m_descriptor(std::exchange(other.m_descriptor, -1)) {}
    MonitoredLogFile(const MonitoredLogFile&) = delete;
    MonitoredLogFile& operator=(const MonitoredLogFile&) = delete;

    /// The open file, at its beginning; this object closes it.
    int descriptor() const noexcept { return m_descriptor; }

private:
    explicit MonitoredLogFile(int descriptor) : m_descriptor(descriptor) {}

    int m_descriptor; ///< -1 when it was moved from
};

} // namespace zrm::host

#endif
