// The refresh part of LogManager: makes the monitoring objects match the configuration.

#include "base/ErrorText.h"
#include "base/TraceScope.h"
#include "logmgr/LogManager.h"
#include "logs/FollowSettings.h"
#include "logtypes/createLogFile.h"
#include "monitor/LogFile.h"

#include <cstdlib>
#include <cstring>
#include <utility>

namespace zrm {

namespace {

TRC1_Anchor anchor{"LogManagerRefresh.cpp"};

constexpr unsigned noWorkSeconds = 60; ///< how long an agent without logs runs before it ends

} // namespace

bool LogManager::canMonitor(const LogFile& object, const ValidLog& log) {
    const FollowSettings* const before = object.followSettings().get();
    const FollowSettings* const now = log.followSettings().get();
    const bool isFollowedAlike =
        before == now || (before != nullptr && now != nullptr && *before == *now);
    return isFollowedAlike && object.type() == log.type() &&
           std::strcmp(object.procedure(), log.procedure()) == 0;
}

std::uint32_t LogManager::refresh() {
    TraceScope trace(anchor);
    ManagerPulse.work("reads the configuration");
    if (DebugLog && DebugLogP == nullptr) {
        openDebugLog();
    }
    FurtherLogs::noteRefresh();
    const bool isFurtherNew = takeFurtherLogs();
    const std::uint32_t validCount = getValidLogs();
    if (validCount > 0 || isFurtherNew || IsConfigEmptied) {
        lockManager();
        waitForRequests();
        buildLogObjects(validCount);
        unlockManager();
        deleteRetiredLogs();
        if (trace.isOn(TRC1_DETAIL)) {
            printSelf();
        }
    } else if (NumLogs != 0) {
        trace.detail()("Continuing to monitor existing log files.");
    }
    if (NumLogs == 0 && FurtherLogsTaken) {
        trace.detail()("Waiting for logs to appear.");
        return trace.result(std::uint32_t{1});
    }
    if (NumLogs == 0) {
        trace.error()("Agent has no work to do.  Exiting...");
        sleepUnlessStopped(noWorkSeconds);
    }
    return trace.result(NumLogs.load());
}

/// Waits, with the manager locked, until no request uses the chain.
void LogManager::waitForRequests() {
    TraceScope trace(anchor);
    if (UseCount == 0) {
        return;
    }
    RefreshWaiting = true;
    ManagerPulse.work("waits for requests to end");
    while (UseCount != 0) {
        trace.detail()("Refresh suspended pending completion of outstanding requests.");
        if (const int code = waitFor(ManagerNotInUse, nullptr)) {
            const ErrorText error(code);
            trace.error()("Error blocking on the manager-not-in-use condition variable. Return "
                          "code = %d; %s",
                          error.number(), error.text());
        }
    }
    RefreshWaiting = false;
    ManagerPulse.work("refreshes the logs");
    trace.detail()("Refresh resuming.");
}

void LogManager::buildLogObjects(unsigned validCount) {
    TraceScope trace(anchor);
    std::uint32_t expected =
        validCount + markLogObjects(validCount > 0 || std::exchange(IsConfigEmptied, false));
    const ValidLog* log = FirstValidLog;
    for (unsigned i = 0; i < validCount; ++i) {
        buildLogObject(*log, findLogObject(log->fileNameLocal()));
        log = log->next();
    }
    expected += buildFurtherLogs();
    retireMarkedLogs();
    if (NumLogs != expected) {
        trace.error()("Fatal error during refresh processing. No. of valid logs = %d: No. of "
                      "actual logs = %d. Agent is terminating.",
                      static_cast<int>(expected), static_cast<int>(NumLogs.load()));
        std::exit(-1);
    }
    discardValidLogs();
}

std::uint32_t LogManager::markLogObjects(bool isConfigNew) {
    TraceScope trace(anchor);
    std::uint32_t unmarked = 0;
    LogFile* object = FirstLogObject;
    for (std::uint32_t i = 0; i < NumLogs; ++i) {
        object->setMarked(isConfigNew || object->followSettings() != nullptr);
        unmarked += object->isMarked() ? 0 : 1;
        object = object->next();
    }
    return trace.result(unmarked);
}

void LogManager::buildLogObject(const ValidLog& log, LogFile* present) {
    TraceScope trace(anchor);
    if (present != nullptr && canMonitor(*present, log)) {
        *present = log;
        present->setMarked(false);
        return;
    }
    if (!isKnownLogType(log.type())) {
        trace.error()("Error during refresh processing. Unknown log type %d encountered for file "
                      "%s. Log not monitored.",
                      static_cast<int>(log.type()), log.fileNameLocal());
        return;
    }
    if (present != nullptr && present->followSettings() != nullptr) {
        present->stopThread(); // its successor continues where it ends
    }
    LogFile* const created = createLogFile(log, FirstLogObject);
    if (created == nullptr) {
        trace.error()("Memory allocation for LogFile object failed.  Agent is terminating.");
        std::exit(-1);
    }
    if (FirstLogObject == nullptr) {
        FirstLogObject = created;
    }
    ++NumLogs;
}

void LogManager::retireMarkedLogs() {
    TraceScope trace(anchor);
    LogFile* object = FirstLogObject;
    for (std::uint32_t left = NumLogs; left > 0; --left) {
        LogFile* const next = object->next();
        if (object->isMarked()) {
            // Ask all of them before waiting for the first: together they take as long as one.
            object->askToStop();
            retireLogObject(object);
            object->addToChain(RetiredLogs);
            RetiredLogs = RetiredLogs == nullptr ? object : RetiredLogs;
        }
        object = next;
    }
}

void LogManager::deleteRetiredLogs() {
    TraceScope trace(anchor);
    ManagerPulse.work("ends the monitoring of logs");
    while (RetiredLogs != nullptr) {
        LogFile* const log = RetiredLogs;
        RetiredLogs = log->next() == log ? nullptr : log->next();
        delete log;
    }
    ManagerPulse.rest();
}

void LogManager::discardValidLogs() {
    TraceScope trace(anchor);
    ValidLog* const first = FirstValidLog.exchange(nullptr);
    if (first == nullptr) {
        return;
    }
    for (ValidLog* log = first->prev(); log != first;) {
        ValidLog* const previous = log->prev();
        delete log;
        log = previous;
    }
    delete first;
}

void LogManager::deleteLogs() {
    TraceScope trace(anchor);
    LogFile* tail = FirstLogObject;
    std::uint32_t count = 1;
    for (; count <= NumLogs && tail->next() != FirstLogObject; ++count) {
        tail = tail->next();
    }
    if (count != NumLogs) {
        trace.error()("Log object chain corrupted. Expected number of logs = %d; actual number = "
                      "%d. Agent is terminating.",
                      static_cast<int>(NumLogs.load()), static_cast<int>(count));
        std::exit(-1);
    }
    // Ask all of them before waiting for the first: together they take as long as one.
    LogFile* log = tail;
    for (std::uint32_t left = count; left > 0; --left) {
        log->askToStop();
        log = static_cast<LogFile*>(log->prev());
    }
    for (log = tail; count > 0; --count) {
        auto* const previous = static_cast<LogFile*>(log->prev());
        deleteLogObject(log);
        log = previous;
    }
}

void LogManager::deleteLogObject(LogFile* log) {
    TraceScope trace(anchor);
    retireLogObject(log);
    delete log;
}

void LogManager::retireLogObject(LogFile* log) {
    TraceScope trace(anchor);
    std::uint32_t count = 0;
    const LogFile* member = FirstLogObject;
    do {
        ++count;
        member = member->next();
    } while (member != FirstLogObject && count < NumLogs);
    if (count != NumLogs) {
        trace.error()("Log object chain corrupted. Expected number of logs = %d; actual number = "
                      "%d. Agent is terminating.",
                      static_cast<int>(NumLogs.load()), static_cast<int>(count));
        std::exit(-1);
    }
    if (log == FirstLogObject) {
        FirstLogObject = NumLogs == 1 ? nullptr : log->next();
    }
    trace.detail()("Deleting log object for file %s.", log->fileNameLocal());
    log->removeFromChain();
    log->addToChain(nullptr); // its destructor then has nothing to unlink it from
    --NumLogs;
}

} // namespace zrm
