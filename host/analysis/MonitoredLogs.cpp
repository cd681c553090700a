#include "host/analysis/MonitoredLogs.h"

#include "logmgr/LogManager.h"
#include "monitor/LogFile.h"

#include <sys/stat.h>

namespace zrm::host {

MonitoredLogs::MonitoredLogs() : m_manager(pTheLogManager) {
    if (m_manager != nullptr) {
        m_manager->beginRequest();
    }
}

MonitoredLogs::~MonitoredLogs() {
    if (m_manager != nullptr) {
        m_manager->endRequest();
    }
}

bool MonitoredLogs::areWanted() const noexcept {
    return m_manager != nullptr && m_manager->isRefreshWaiting();
}

std::vector<LogFile*> MonitoredLogs::all() const {
    std::vector<LogFile*> logs;
    LogFile* log = nullptr;
    while (m_manager != nullptr && (log = m_manager->getNextLogObject(
                                        log, static_cast<unsigned>(logs.size()))) != nullptr) {
        logs.push_back(log);
    }
    return logs;
}

bool MonitoredLogs::isReadable(const LogFile& log) noexcept {
    struct stat status {};
    return log.type() == 'E' ||
           (stat(log.fileNameLocal(), &status) == 0 && S_ISREG(status.st_mode));
}

LogFile* MonitoredLogs::find(std::string_view path) const {
    for (LogFile* const log : all()) {
        if (path == log->fileNameUTF8()) {
            return log;
        }
    }
    return nullptr;
}

} // namespace zrm::host
