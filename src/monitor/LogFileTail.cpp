#include "monitor/LogFile.h"

#include "agent/ErrorText.h"
#include "agent/TraceScope.h"
#include "monitor/DescriptorReserve.h"
#include "tables/zrm_rmlogent_manager.h"

#include <cerrno>
#include <cstring>

#include <fcntl.h>
#include <sys/select.h>
#include <sys/stat.h>
#include <unistd.h>

// Following a log's growth, on the log's own thread.

namespace {

TRC1_Anchor anchor{"LogFileTail.cpp"};

} // namespace

/// Counts without a locked instruction: only the log's thread writes the counter.
void LogFile::count(std::atomic<std::int64_t>& counter) noexcept {
    counter.store(counter.load(std::memory_order_relaxed) + 1, std::memory_order_relaxed);
}

void LogFile::openLogAndSeek() {
    TraceScope trace(anchor);
    std::FILE* file = std::fopen(fileNameLocal(), "r");
    if (file != nullptr && DescriptorReserve::has(fileno(file))) {
        std::fclose(file);
        file = nullptr;
        errno = EMFILE;
    }
    LogFileP = file;
    if (LogFileP == nullptr) {
        const ErrorText error(errno);
        DescriptorReserve::noteFailure(error.number());
        trace.error()("Error opening file %s.  errno = %d; %s", fileNameLocal(), error.number(),
                      error.text());
        setMonitorStatus(MONITOR_ERR_OPEN);
        return;
    }
    LogFD = fileno(LogFileP);
    fcntl(LogFD, F_SETFD, FD_CLOEXEC); // not for the commands that other logs run
    noteOpenFile();
    LogEOF = lseek(LogFD, 0, SEEK_END);
    if (LogEOF < 0) {
        const ErrorText error(errno);
        trace.error()("Error while seeking EOF for file %s.  errno = %d; %s", fileNameLocal(),
                      error.number(), error.text());
        closeLog();
        setMonitorStatus(MONITOR_ERR_SEEK_EOF);
        return;
    }
    guardEnd();
}

void LogFile::guardEnd() noexcept {
    m_guard.take(LogFD, LogEOF);
}

/// Notes in the ledger which file LogFD is.
void LogFile::noteOpenFile() {
    struct stat status;
    if (fstat(LogFD, &status) == 0) {
        m_ledger.noteFile(FileIdentity{status.st_dev, status.st_ino});
    }
}

void LogFile::closeLog() {
    TraceScope trace(anchor);
    std::fclose(LogFileP);
    m_ledger.noteFile(std::nullopt);
    LogFileP = nullptr;
    LogFD = -1;
    LogEOF = -1;
    m_lineReader.release();
}

void LogFile::waitForEventLoop(timeval interval) {
    TraceScope trace(anchor);
    // A wait on no descriptors leaves the empty sets empty.
    fd_set readable;
    fd_set writable;
    fd_set exceptional;
    FD_ZERO(&readable);
    FD_ZERO(&writable);
    FD_ZERO(&exceptional);
    while (monitorStatus() == MONITOR_RUNNING) {
        if (!checkForChange()) {
            return;
        }
        timeval timeOut = interval;
        if (select(0, &readable, &writable, &exceptional, &timeOut) < 0 && errno != EINTR) {
            const ErrorText error(errno);
            trace.error()("Error occurred while waiting for data for file %s; errno = %d; %s",
                          fileNameLocal(), error.number(), error.text());
            setMonitorStatus(MONITOR_ERR_WAIT_LOOP);
            return;
        }
    }
}

/// One look at the file's size; false when the monitor has failed and its status says why.
bool LogFile::checkForChange() {
    TraceScope trace(anchor);
    const std::int64_t newEOF = lseek(LogFD, 0, SEEK_END);
    if (newEOF > LogEOF) {
        if (!m_guard.holds(LogFD)) {
            // What is read stays what it is; the ledger alone knows.
            noteTruncated(LogEOF, LogLedger::Truncation::regrown);
        }
        return trace.result(readGrowth());
    }
    if (newEOF < 0) {
        const ErrorText error(errno);
        trace.error()("Error while seeking new EOF for file %s. errno = %d; %s", fileNameLocal(),
                      error.number(), error.text());
        setMonitorStatus(MONITOR_ERR_SEEK_EOF);
        return trace.result(false);
    }
    if (newEOF < LogEOF) {
        trace.error()("Warning: log file %s truncated. Resetting EOF to offset %ld.",
                      fileNameLocal(), static_cast<long>(newEOF));
        noteTruncated(newEOF, LogLedger::Truncation::seen);
        LogEOF = newEOF;
        m_guard.take(LogFD, newEOF);
    }
    return trace.result(true);
}

/// The file holds other bytes than those that were read; it is followed from `newEnd` on.
void LogFile::noteTruncated(std::int64_t newEnd, LogLedger::Truncation kind) {
    TraceScope trace(anchor);
    m_ledger.noteTruncated(kind, newEnd, m_guard.unreadInCopy(LogFD, fileNameLocal()));
}

bool LogFile::readGrowth() {
    TraceScope trace(anchor);
    if (lseek(LogFD, static_cast<off_t>(LogEOF), SEEK_SET) < 0) {
        const ErrorText error(errno);
        trace.error()("Error while rewinding file pointer for file %s; errno = %d; %s",
                      fileNameLocal(), error.number(), error.text());
        setMonitorStatus(MONITOR_ERR_REWIND);
        return trace.result(false);
    }
    const std::int64_t entriesBefore = numEvents();
    const long outcome = readLog();
    if (numEvents() != entriesBefore) {
        m_ledger.noteEntries();
    }
    if (outcome != 0) {
        setMonitorStatus(MONITOR_ERR_READ);
        return trace.result(false);
    }
    // Where reading stopped: what was appended meanwhile counts only if it was read.
    const std::int64_t consumed = lseek(LogFD, 0, SEEK_CUR);
    if (consumed < 0) {
        const ErrorText error(errno);
        trace.error()("Error occurred while determining new EOF for file %s. errno = %d; %s",
                      fileNameLocal(), error.number(), error.text());
        setMonitorStatus(MONITOR_ERR_RESET_EOF);
        return trace.result(false);
    }
    m_ledger.addBytes(consumed - LogEOF);
    LogEOF = consumed;
    m_guard.take(LogFD, consumed);
    return trace.result(true);
}

long LogFile::readLog() {
    TraceScope trace(anchor);
    m_lineReader.start(LogFD);
    while (char* const line = m_lineReader.next()) {
        count(NumEvents);
        const bool isRow = formatEntryAsRow(line, &m_row, nullptr) == 0;
        if (isRow) {
            m_ledger.noteTime(m_row.entrytime[0]);
            zrm_rmlogent_manager::EventArrived(&m_row, 1);
        } else {
            count(NumFormatErrors);
            m_ledger.noteRejected(line);
        }
        if (std::FILE* const debugLog = debugLogStream()) {
            writeRecord(debugLog, line, std::strlen(line), isRow ? &m_row : nullptr,
                        isRow ? sizeof m_row : 0);
        } else {
            traceEntry();
        }
    }
    if (m_lineReader.error() != 0) {
        const ErrorText error(m_lineReader.error());
        trace.error()("Error occurred while reading file %s.  errno = %d; %s", fileNameLocal(),
                      error.number(), error.text());
        return trace.result(-1L);
    }
    return trace.result(0L);
}
