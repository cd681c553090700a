#include "logmgr/LogManager.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"
#include "logs/LogManagerUtil.h"
#include "monitor/LogFile.h"

#include <cerrno>
#include <cstdlib>
#include <cstring>
#include <new>

#include <time.h>

namespace zrm {

namespace {

TRC1_Anchor anchor{"LogManager.cpp"};

constexpr const char* defaultSyslogConfFile = "/etc/syslog.conf";

/// The value of an environment variable, or null if it is unset or empty.
const char* environment(const char* name) {
    const char* const value = std::getenv(name);
    return value != nullptr && *value != '\0' ? value : nullptr;
}

const char* textOf(const std::unique_ptr<char[]>& text) {
    return text ? text.get() : "";
}

} // namespace

LogManager::LogManager() {
    TraceScope trace(anchor);
    getEnvVars();
    startManagerThread();
    if (trace.isOn(TRC1_FINE)) {
        printSelf();
    }
}

LogManager::~LogManager() {
    TraceScope trace(anchor);
    shutdown();
    if (trace.isOn(TRC1_DETAIL)) {
        printSelf();
    }
}

void LogManager::getEnvVars() {
    TraceScope trace(anchor);
    if (const char* const config = environment("ZRM_CONFIG_FILE")) {
        ConfigFile = copyOf(config);
        trace.detail()("\"%s\" environment variable set to \"%s\"", "ZRM_CONFIG_FILE", config);
    } else {
        trace.detail()("No %s environment variable specified.", "ZRM_CONFIG_FILE");
    }
    if (const char* const syslogConf = environment("ZRM_SYSLOG_CONF")) {
        SyslogConfFile = copyOf(syslogConf);
        trace.detail()("\"%s\" environment variable set to \"%s\"", "ZRM_SYSLOG_CONF", syslogConf);
    } else {
        trace.detail()("No %s environment variable specified; using default file %s.",
                       "ZRM_SYSLOG_CONF", defaultSyslogConfFile);
        SyslogConfFile = copyOf(defaultSyslogConfFile);
    }
    if (const char* const debugLog = environment("AGENT_DEBUG_LOG")) {
        DebugLog = copyOf(debugLog);
        trace.detail()("\"%s\" environment variable set to \"%s\". Agent debug mode is ON.",
                       "AGENT_DEBUG_LOG", debugLog);
    } else {
        trace.detail()("No \"%s\" environment variable specified. Agent debug mode is OFF.",
                       "AGENT_DEBUG_LOG");
    }
}

std::unique_ptr<char[]> LogManager::allocMem(std::size_t size) const {
    TraceScope trace(anchor);
    std::unique_ptr<char[]> memory(new (std::nothrow) char[size]());
    if (!memory) {
        const ErrorText error(errno);
        trace.error()("Memory allocation failed for %ld bytes; errno = %d; %s",
                      static_cast<long>(size), error.number(), error.text());
        std::exit(-1);
    }
    return memory;
}

std::unique_ptr<char[]> LogManager::copyOf(const char* text) const {
    const std::size_t length = std::strlen(text);
    std::unique_ptr<char[]> copy = allocMem(length + 1);
    std::memcpy(copy.get(), text, length);
    return copy;
}

void LogManager::lockManager() {
    TraceScope trace(anchor);
    if (const int code = pthread_mutex_lock(&ManagerLock)) {
        const ErrorText error(code);
        trace.error()("Error locking log manager.  Return code = %d; %s.  Use the return code and "
                      "message to investigate the failure.  Agent is terminating.",
                      error.number(), error.text());
        std::exit(-1);
    }
    trace.detail()("Log manager locked.");
}

void LogManager::unlockManager() {
    TraceScope trace(anchor);
    if (const int code = pthread_mutex_unlock(&ManagerLock)) {
        const ErrorText error(code);
        trace.error()("Error unlocking log manager.  Return code = %d; %s.  Use the return code "
                      "and message to investigate the failure.  Agent is terminating.",
                      error.number(), error.text());
        std::exit(-1);
    }
    trace.detail()("Log manager unlocked.");
}

void LogManager::beginRequest() {
    TraceScope trace(anchor);
    lockManager();
    const std::int32_t count = ++UseCount;
    trace.detail()("Use count is now %d.", count);
    unlockManager();
}

void LogManager::endRequest() {
    TraceScope trace(anchor);
    lockManager();
    const std::int32_t count = --UseCount;
    if (count == -1) {
        UseCount = 0;
        trace.error()("Use count going negative. Current value is %d. Setting to %d", count, 0);
    } else if (count == 0) {
        if (const int code = pthread_cond_broadcast(&ManagerNotInUse)) {
            const ErrorText error(code);
            trace.error()("Error signaling condition variable. errno = %d; %s", error.number(),
                          error.text());
        } else {
            trace.detail()("Not-in-use signal sent.");
        }
    } else {
        trace.detail()("Use count is now %d.", count);
    }
    unlockManager();
}

void LogManager::setServerUp() {
    TraceScope trace(anchor);
    lockManager();
    AgentServerUp = true;
    if (const int code = pthread_cond_signal(&AgentServerNotUp)) {
        const ErrorText error(code);
        trace.error()("Error signaling server-up condition variable.  Return code = %d; %s",
                      error.number(), error.text());
    } else {
        trace.detail()("Agent server is listening; signal sent.");
    }
    unlockManager();
}

LogFile* LogManager::getNextLogObject(LogFile* current, unsigned index) {
    TraceScope trace(anchor);
    if (current == nullptr) {
        if (NumLogs == 0) {
            trace.detail()("No logs are currently being monitored.");
            return trace.result<LogFile*>(nullptr);
        }
        return trace.result(FirstLogObject.load());
    }
    LogFile* const next = current->next();
    if (next == FirstLogObject) {
        return trace.result<LogFile*>(nullptr);
    }
    if (NumLogs <= index) {
        trace.error()("Log object chain corrupted. Request terminating.");
        return trace.result<LogFile*>(nullptr);
    }
    return trace.result(next);
}

LogFile* LogManager::findLogObject(const char* localName) {
    TraceScope trace(anchor);
    LogFile* log = FirstLogObject;
    for (std::uint32_t i = 0; i < NumLogs; ++i) {
        if (std::strcmp(log->fileNameLocal(), localName) == 0) {
            return trace.result(log);
        }
        log = log->next();
    }
    return trace.result<LogFile*>(nullptr);
}

void LogManager::shutdown() {
    TraceScope trace(anchor);
    trace.detail()("Shutdown commencing.");
    stopManagerThread();
    // From here on nothing reads the paths.
    ConfigFile.reset();
    SyslogConfFile.reset();
    DebugLog.reset();
    discardValidLogs();
    if (FirstLogObject != nullptr) {
        deleteLogs();
    }
    if (DebugLogP != nullptr) {
        closeDebugLog();
    }
}

void LogManager::openDebugLog() {
    TraceScope trace(anchor);
    std::FILE* const stream = LogManagerUtil::openStream(textOf(DebugLog), "a");
    if (stream == nullptr) {
        const ErrorText error(errno);
        trace.error()("Error opening debug log \"%s\"; errno = %d; %s", textOf(DebugLog),
                      error.number(), error.text());
        return;
    }
    std::setvbuf(stream, nullptr, _IOLBF, BUFSIZ);
    DebugLogP = stream;
    LogFile::setDebugLog(stream);
}

void LogManager::closeDebugLog() {
    TraceScope trace(anchor);
    LogFile::setDebugLog(nullptr);
    if (std::fclose(DebugLogP.exchange(nullptr)) != 0) {
        const ErrorText error(errno);
        trace.error()("Error closing debug log \"%s\"; errno = %d; %s", textOf(DebugLog),
                      error.number(), error.text());
    }
}

void LogManager::printSelf() const {
    TraceScope trace(anchor);
    // Both times show that of the syslog configuration.
    const std::time_t changed = SyslogConfFileLastChanged;
    char lastChanged[26] = ""; // stays empty for a year that cannot be printed
    ctime_r(&changed, lastChanged);
    trace.always()(
        "\n\tthis\t\t\t\t= %p\n\tConfigFile\t\t\t= \"%s\"\n"
        "\tConfigFileLastChanged\t\t= %s\tSyslogConfFile\t\t\t= \"%s\"\n"
        "\tSyslogConfFileLastChanged\t= %s\tNumLogs\t\t\t\t= %d\n"
        "\tFirstLogObject\t\t\t= %p\n\tFirstValidLog\t\t\t= %p\n"
        "\tUseCount\t\t\t= %d\n\tManagerThread\t\t\t= %s\n\tManagerLock\t\t\t= %s\n"
        "\tManagerNotInUse\t\t\t= %s\n\tAgentServerUp\t\t\t= %d\n"
        "\tAgentServerNotUp\t\t= %s\n\tDebugLog\t\t\t= \"%s\"\n"
        "\tDebugLogP\t\t\t= %p\n",
        static_cast<const void*>(this), textOf(ConfigFile), lastChanged, textOf(SyslogConfFile),
        lastChanged, static_cast<int>(NumLogs.load()), static_cast<void*>(FirstLogObject.load()),
        static_cast<void*>(FirstValidLog.load()), UseCount.load(), LogManagerUtil::handleDump,
        LogManagerUtil::handleDump, LogManagerUtil::handleDump,
        static_cast<int>(AgentServerUp.load()), LogManagerUtil::handleDump, textOf(DebugLog),
        static_cast<void*>(DebugLogP.load()));
}

} // namespace zrm
