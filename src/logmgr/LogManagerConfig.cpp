// The configuration part of LogManager: reads the chain of valid logs from the log configuration
// or, if that has none, from the syslog configuration.

#include "base/TraceScope.h"
#include "logmgr/LogManager.h"
#include "logs/LogManagerUtil.h"

#include <cstdlib>
#include <new>

namespace zrm {

namespace {

TRC1_Anchor anchor{"LogManagerConfig.cpp"};

} // namespace

std::uint32_t LogManager::getValidLogs() {
    TraceScope trace(anchor);
    if (!ConfigFile) {
        return trace.result(std::uint32_t{0});
    }
    const std::time_t changed = LogManagerUtil::fileLastModified(ConfigFile.get());
    if (changed == 0 && FurtherLogsTaken) {
        trace.detail()("There is no log configuration %s.", ConfigFile.get());
        return trace.result(std::uint32_t{0});
    }
    if (changed == 0) {
        trace.error()("Attempting to build default list from syslog file %s.",
                      SyslogConfFile.get());
        return trace.result(getDefaultLogs());
    }
    if (changed == ConfigFileLastChanged) {
        trace.detail()("%s has not changed since last refresh. No refresh performed.",
                       ConfigFile.get());
        return trace.result(std::uint32_t{0});
    }
    const std::uint32_t count = createValidLogList(CONFIG_USER, ConfigFile.get());
    if (count == 0 && FurtherLogsTaken) {
        trace.detail()("No valid log files found in %s.", ConfigFile.get());
        IsConfigEmptied = true;
        ConfigFileLastChanged = changed;
        return trace.result(count);
    }
    if (count == 0) {
        trace.error()("No valid log files found in %s.  Attempting to build default list from "
                      "syslog file %s.",
                      ConfigFile.get(), SyslogConfFile.get());
        return trace.result(getDefaultLogs());
    }
    // A later switch to the other source always rebuilds.
    ConfigFileLastChanged = changed;
    SyslogConfFileLastChanged = 0;
    return trace.result(count);
}

/// The valid logs of the syslog configuration; 0 if there are none or the file has not changed.
std::uint32_t LogManager::getDefaultLogs() {
    TraceScope trace(anchor);
    const std::time_t changed = LogManagerUtil::fileLastModified(SyslogConfFile.get());
    if (changed == 0) {
        return trace.result(std::uint32_t{0});
    }
    if (changed == SyslogConfFileLastChanged) {
        trace.detail()("%s has not changed since last refresh. No refresh performed",
                       SyslogConfFile.get());
        return trace.result(std::uint32_t{0});
    }
    const std::uint32_t count = createValidLogList(CONFIG_DEFAULT, SyslogConfFile.get());
    if (count == 0) {
        trace.error()("No valid log files found in %s.", SyslogConfFile.get());
        return trace.result(count);
    }
    SyslogConfFileLastChanged = changed;
    ConfigFileLastChanged = 0;
    return trace.result(count);
}

std::uint32_t LogManager::createValidLogList(WhenceConfig whence, const char* path) {
    TraceScope trace(anchor);
    std::uint32_t count = 0;
    while (char* const record = LogManagerUtil::getNextRec(path)) {
        std::unique_ptr<ValidLog> log(new (std::nothrow) ValidLog(whence, record, FirstValidLog));
        if (!log) {
            trace.error()("Memory allocation for ValidLog object failed.  Agent is terminating.");
            std::exit(-1);
        }
        if (!log->isValid()) {
            continue;
        }
        ++count;
        if (FirstValidLog == nullptr) {
            FirstValidLog = log.get();
        }
        // The chain owns the object until discardValidLogs.
        static_cast<void>(log.release());
    }
    return trace.result(count);
}

} // namespace zrm
