#ifndef ZRM_HOST_MONITORED_LOGS_H
#define ZRM_HOST_MONITORED_LOGS_H

#include <string_view>
#include <vector>

namespace zrm {
class LogFile;
class LogManager;
} // namespace zrm

namespace zrm::host {

/// The monitored logs, kept unchanged while the object exists: a refresh waits for its destruction.
/// The constructor may wait for a refresh. Any thread that holds no lock which a log's thread
/// needs.
class MonitoredLogs {
public:
    MonitoredLogs();
    ~MonitoredLogs();
    MonitoredLogs(const MonitoredLogs&) = delete;
    MonitoredLogs& operator=(const MonitoredLogs&) = delete;

    /// True once a refresh, and with it every changed log, waits for the destruction of the object.
    bool areWanted() const noexcept;
    std::vector<LogFile*> all() const;
    /// The log with this full path, in UTF-8; null when it is not monitored.
    LogFile* find(std::string_view path) const;

    /// Whether a report on the log starts without blocking: opening a pipe that has taken the place
    /// of the file would wait for a writer.
    static bool isReadable(const LogFile& log) noexcept;

private:
    LogManager* const m_manager; ///< null while the process exits
};

} // namespace zrm::host

#endif
