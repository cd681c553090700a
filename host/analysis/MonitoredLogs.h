#ifndef ZRM_HOST_MONITORED_LOGS_H
#define ZRM_HOST_MONITORED_LOGS_H

#include <string_view>
#include <vector>

namespace zrm {
class LogFile;
class LogManager;
} // namespace zrm

namespace zrm::host {

/// The monitored logs, held as they are while the object lives: a refresh waits for its end. To be
/// constructed may itself wait for a refresh. Any thread, which holds no lock that a log's thread
/// wants.
class MonitoredLogs {
public:
    MonitoredLogs();
    ~MonitoredLogs();
    MonitoredLogs(const MonitoredLogs&) = delete;
    MonitoredLogs& operator=(const MonitoredLogs&) = delete;

    /// True once a refresh waits for the object's end, and with it every log that has changed.
    bool areWanted() const noexcept;
    std::vector<LogFile*> all() const;
    /// The log of this whole path, in UTF-8; null when it is not monitored.
    LogFile* find(std::string_view path) const;

    /// Whether a report on the log begins at once: one on a pipe in the place of its file would
    /// wait for a writer.
    static bool isReadable(const LogFile& log) noexcept;

private:
    LogManager* const m_manager; ///< null while the process ends
};

} // namespace zrm::host

#endif
