#include "host/analysis/MonitoredLogs.h"

#include "agent/zrmmain.h"
#include "logmgr/LogManager.h"
#include "monitor/LogFile.h"

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

std::vector<LogFile*> MonitoredLogs::all() const {
    std::vector<LogFile*> logs;
    LogFile* log = nullptr;
    while (m_manager != nullptr && (log = m_manager->getNextLogObject(
                                        log, static_cast<unsigned>(logs.size()))) != nullptr) {
        logs.push_back(log);
    }
    return logs;
}

LogFile* MonitoredLogs::find(std::string_view path) const {
    for (LogFile* const log : all()) {
        if (path == log->fileNameUTF8()) {
            return log;
        }
    }
    return nullptr;
}
