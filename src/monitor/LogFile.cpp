#include "monitor/LogFile.h"

#include "base/BrevanTime.h"
#include "base/ErrorText.h"
#include "base/ProcessValues.h"
#include "base/TraceScope.h"
#include "base/UTF8Conv.h"
#include "framework/locale.h"
#include "logs/LogManagerUtil.h"
#include "logs/ValidLog.h"
#include "monitor/FollowLedger.h"

#include <algorithm>
#include <cstdlib>
#include <cstring>
#include <string_view>

namespace zrm {

namespace {

TRC1_Anchor anchor{"LogFile.cpp"};

/// Copies at most the column's width, without a terminator.
template <std::size_t width> void fillColumn(char (&column)[width], std::string_view text) {
    std::memcpy(column, text.data(), std::min(text.size(), width));
}

} // namespace

LogFile::LogFile(const ValidLog& log, LogFile* chainHead)
    : LogBase(log), MonitorStartStopTime(std::time(nullptr)),
      m_followLedger(isFollowed() ? std::make_unique<FollowLedger>() : nullptr) {
    TraceScope trace(anchor);
    addToChain(chainHead);
    initializeLock();
}

LogFile::~LogFile() {
    TraceScope trace(anchor);
    removeFromChain();
    const ErrorText error(pthread_mutex_destroy(&LogLock));
    if (error.number() != 0) {
        trace.error()("Error destroying mutex for %s.  Return code = %d; %s", fileNameLocal(),
                      error.number(), error.text());
    } else {
        trace.detail()("Mutex destroyed for %s.", fileNameLocal());
    }
}

void LogFile::initializeLock() {
    TraceScope trace(anchor);
    pthread_mutexattr_t attributes;
    if (const int code = pthread_mutexattr_init(&attributes)) {
        const ErrorText error(code);
        trace.error()("Error initializing mutex attribute object for %s. Return code = %d; %s.  "
                      "Use the return code and message to investigate the failure.  Agent is "
                      "terminating.",
                      fileNameLocal(), error.number(), error.text());
        std::exit(-1);
    }
    if (const int code = pthread_mutex_init(&LogLock, &attributes)) {
        const ErrorText error(code);
        trace.error()("Error initializing mutex for %s.  Return code = %d; %s  Use the return code "
                      "and message to investigate the failure.  Agent is terminating.",
                      fileNameLocal(), error.number(), error.text());
        std::exit(-1);
    }
    if (const int code = pthread_mutexattr_destroy(&attributes)) {
        const ErrorText error(code);
        trace.error()("Error destroying mutex attribute object for %s. Return code = %d; %s.  Use "
                      "the return code and message to investigate the failure.  Agent is "
                      "terminating.",
                      fileNameLocal(), error.number(), error.text());
        std::exit(-1);
    }
    trace.detail()("Mutex initialized for %s.", fileNameLocal());
}

LogFile& LogFile::operator=(const ValidLog& log) {
    TraceScope trace(anchor);
    if (trace.isOn(TRC1_DETAIL)) {
        printSelf();
    }
    lockLog();
    LogDebugMode = log.debugMode();
    unlockLog();
    if (monitorStatus() != MONITOR_RUNNING) {
        stopThread();
        startThread();
    }
    if (trace.isOn(TRC1_DETAIL)) {
        printSelf();
    }
    return *this;
}

void LogFile::startThread() {
    TraceScope trace(anchor);
    pthread_attr_t attributes;
    if (const int code = pthread_attr_init(&attributes)) {
        const ErrorText error(code);
        trace.error()("Error initializing thread attribute object for %s. Return code = %d; %s.  "
                      "Use the return code and message to investigate the failure.  Agent is "
                      "terminating.",
                      fileNameLocal(), error.number(), error.text());
        std::exit(-1);
    }
    if (const int code = pthread_attr_setdetachstate(&attributes, PTHREAD_CREATE_JOINABLE)) {
        const ErrorText error(code);
        trace.detail()("Error making thread attribute object joinable for %s. Return code = %d; "
                       "%s. Continuing.",
                       fileNameLocal(), error.number(), error.text());
    }
    lockLog();
    if (const int code = pthread_create(&LogThread, &attributes, logThread, this)) {
        const ErrorText error(code);
        trace.error()("Error starting thread for %s.  Return code = %d; %s", fileNameLocal(),
                      error.number(), error.text());
    } else {
        m_hasThread = true;
        m_ledger.noteStart();
        MonitorStatus = MONITOR_RUNNING;
        MonitorStartStopTime = std::time(nullptr);
    }
    unlockLog();
    if (const int code = pthread_attr_destroy(&attributes)) {
        const ErrorText error(code);
        trace.error()("Error destroying thread attribute object for %s. Return code = %d; %s.  Use "
                      "the return code and message to investigate the failure.  Agent is "
                      "terminating.",
                      fileNameLocal(), error.number(), error.text());
        std::exit(-1);
    }
}

void LogFile::askToStop() noexcept {
    _MonitorStatus running = MONITOR_RUNNING;
    MonitorStatus.compare_exchange_strong(running, MONITOR_STOPPED);
}

void LogFile::stopThread() {
    TraceScope trace(anchor);
    lockLog();
    const _MonitorStatus status = monitorStatus();
    if (status == MONITOR_RUNNING) {
        MonitorStatus = MONITOR_STOPPED;
    }
    unlockLog();
    // There is no thread to join if it could not be restarted after its predecessor was joined.
    if (status != MONITOR_NOT_STARTED && m_hasThread) {
        pthread_join(LogThread, nullptr);
        m_hasThread = false;
    }
}

void* logThread(void* logFile) {
    TraceScope trace(anchor);
    LogFile& log = *static_cast<LogFile*>(logFile);
    trace.detail()("Thread successfully started for log file %s.", log.fileNameLocal());
    // startThread holds the lock until the status is Running.
    log.lockLog();
    log.unlockLog();
    log.m_end = {};
    log.m_pulse.work("opens the log");
    log.processLogData();
    log.m_pulse.rest();
    if (log.LogFileP != nullptr) {
        log.printSelf();
    }
    trace.detail()("Thread for log file %s terminating.", log.fileNameLocal());
    log.MonitorStartStopTime = std::time(nullptr);
    return nullptr;
}

void LogFile::lockLog() const {
    TraceScope trace(anchor);
    if (const int code = pthread_mutex_lock(&LogLock)) {
        const ErrorText error(code);
        trace.error()("Error locking mutex for %s.  Return code = %d; %s.  Use the return code and "
                      "message to investigate the failure.  Agent is terminating.",
                      fileNameLocal(), error.number(), error.text());
        std::exit(-1);
    }
    trace.detail()("Mutex locked for %s.", fileNameLocal());
}

void LogFile::unlockLog() const {
    TraceScope trace(anchor);
    if (const int code = pthread_mutex_unlock(&LogLock)) {
        const ErrorText error(code);
        trace.error()("Error unlocking mutex for %s.  Return code = %d; %s.  Use the return code "
                      "and message to investigate the failure.  Agent is terminating.",
                      fileNameLocal(), error.number(), error.text());
        std::exit(-1);
    }
    trace.detail()("Mutex unlocked for %s.", fileNameLocal());
}

void LogFile::setMonitorStatus(_MonitorStatus status) {
    TraceScope trace(anchor);
    lockLog();
    MonitorStatus = status;
    unlockLog();
}

void LogFile::getMonitorStatus(char* buffer, long bufferLength) const {
    TraceScope trace(anchor);
    const std::string_view text = monitorStatusText(monitorStatus());
    if (bufferLength > 0) {
        std::memcpy(buffer, text.data(),
                    std::min(text.size(), static_cast<std::size_t>(bufferLength)));
    }
}

void LogFile::fillCommonColumns(zrm_rmlogent_data_t* row) const {
    TraceScope trace(anchor);
    const std::string_view name = fileNameUTF8();
    const std::size_t pathLength = std::min(LogPathNameLengthUTF8, name.size());
    const std::string_view path = name.substr(0, pathLength);
    const std::string_view file = name.substr(pathLength);
    fillColumn(row->originnode, gSystemName != nullptr ? gSystemName : "");
    // The columns for the local code page take the UTF-8 form too.
    fillColumn(row->ulogpath, path);
    fillColumn(row->logpath, path);
    fillColumn(row->logname, file);
    fillColumn(row->ulogname, file);
    fillChangingColumns(row);
}

/// The common columns that vary between a log's rows or that the table writes.
void LogFile::fillChangingColumns(zrm_rmlogent_data_t* row) {
    row->freqthresh = 0;
    row->periodthrs = 0;
    row->sampleno = 0;
    row->rowno = 0;
    BrevanTime::generateCurrentTimestamp(row->timestamp);
}

/// What is asked of the framework for a log of the log configuration is part of its contract.
std::int32_t LogFile::columnToUTF8(char* column, std::size_t room, std::string_view text) const {
    return isFollowed() ? UTF8Conv::columnToUTF8(column, room, text)
                        : UTF8Conv::Convert_toUTF8(column, room, text.data(), text.size(),
                                                   LOC2_NO_TERMINATOR);
}

void LogFile::printSelf() const {
    TraceScope trace(anchor);
    LogBase::printSelf();
    const std::time_t changed = MonitorStartStopTime;
    char changedText[64] = "";
    ctime_r(&changed, changedText);
    trace.always()(
        "\n\tRefreshMode\t\t= %d\n\tLogThread\t\t= %s\n\tLogLock\t\t\t= %s\n\tLogFileP\t\t= %p"
        "\n\tLogFD\t\t\t= %d\n\tLogEOF\t\t\t= %ld\n\tMonitorStatus\t\t= %d"
        "\n\tMonitorStartStopTime\t= %.*s\n\tNumEvents\t\t= %d\n\tNumFormatErrors\t\t= %d"
        "\n\tOptimumBlockSize\t= %ld\n\tDebugFileLock\t\t= %s\n",
        static_cast<int>(RefreshMode), LogManagerUtil::handleDump, LogManagerUtil::handleDump,
        static_cast<const void*>(LogFileP.load()), LogFD.load(), static_cast<long>(LogEOF.load()),
        static_cast<int>(monitorStatus()), 24, changedText, static_cast<int>(numEvents()),
        static_cast<int>(numFormatErrors()), static_cast<long>(OptimumBlockSize.load()),
        LogManagerUtil::handleDump);
}

} // namespace zrm
