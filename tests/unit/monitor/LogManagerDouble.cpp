#include "LogManagerDouble.h"

#include "agent/zrmmain.h"
#include "logmgr/LogManager.h"

namespace {

std::string debugLogPath;

} // namespace

// In this program the log manager's construction and destruction are these.

LogManager::LogManager() {
    if (!debugLogPath.empty()) {
        DebugLogP = std::fopen(debugLogPath.c_str(), "a");
        std::setvbuf(DebugLogP, nullptr, _IOLBF, BUFSIZ);
    }
}

LogManager::~LogManager() {
    if (DebugLogP != nullptr) {
        std::fclose(DebugLogP);
    }
}

LogManagerDouble::LogManagerDouble(const std::string& debugLog) {
    debugLogPath = debugLog;
    pTheLogManager = new LogManager;
}

LogManagerDouble::~LogManagerDouble() {
    delete pTheLogManager.exchange(nullptr);
}
