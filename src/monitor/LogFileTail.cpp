#include "monitor/LogFile.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"
#include "framework/EventRoom.h"
#include "monitor/DescriptorReserve.h"

#include <cerrno>
#include <cstring>

#include <fcntl.h>
#include <sys/select.h>
#include <sys/stat.h>
#include <unistd.h>

namespace zrm {

// Follows a log's growth on the log's own thread.

namespace {

TRC1_Anchor anchor{"LogFileTail.cpp"};

/// How long to count the lines that the end of the process leaves unread.
constexpr std::chrono::milliseconds countingTime{500};

/// Waits until rows may be offered. Returns false if the log has to end or the process is ending
/// before that. Apart from LogFile::offer, which runs for each line and rarely waits.
[[gnu::noinline]] bool waitForRoom(const LogFile& log, Pulse& pulse) {
    const auto isRunning = [&log] { return log.monitorStatus() == MONITOR_RUNNING; };
    pulse.work("waits for room in the queue of events");
    EventRoom::wait(isRunning);
    if (!EventRoom::mayOffer() && (!isRunning() || EventRoom::now() == EventRoom::State::CLOSED)) {
        return false;
    }
    pulse.work("reads the log");
    return true;
}

} // namespace

/// Counts without an atomic read-modify-write: only the log's thread writes the counter.
void LogFile::count(std::atomic<std::int64_t>& counter) noexcept {
    counter.store(counter.load(std::memory_order_relaxed) + 1, std::memory_order_relaxed);
}

void LogFile::openLogAndSeek() {
    TraceScope trace(anchor);
    // A pipe in place of the log has no end to seek to.
    const int fd = DescriptorReserve::openLog(fileNameLocal());
    if (fd < 0) {
        const ErrorText error(errno);
        trace.error()("Error opening file %s.  errno = %d; %s", fileNameLocal(), error.number(),
                      error.text());
        setMonitorStatus(MONITOR_ERR_OPEN);
        return;
    }
    LogFileP = &m_lineReader;
    LogFD = fd;
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

/// Records in the ledger which file LogFD is.
void LogFile::noteOpenFile() {
    struct stat status;
    if (fstat(LogFD, &status) == 0) {
        m_ledger.noteFile(FileIdentity{status.st_dev, status.st_ino});
    }
}

void LogFile::closeLog() {
    TraceScope trace(anchor);
    close(LogFD);
    m_ledger.noteFile(std::nullopt);
    LogFileP = nullptr;
    LogFD = -1;
    LogEOF = -1;
    m_lineReader.release();
}

void LogFile::waitForEventLoop(timeval interval) {
    TraceScope trace(anchor);
    // With no descriptors to wait for, the empty sets stay empty.
    fd_set readable;
    fd_set writable;
    fd_set exceptional;
    FD_ZERO(&readable);
    FD_ZERO(&writable);
    FD_ZERO(&exceptional);
    while (monitorStatus() == MONITOR_RUNNING) {
        m_pulse.work("looks at the log");
        if (!checkForChange()) {
            return;
        }
        m_pulse.rest();
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

/// Checks the file's size once. Returns false if the monitor has failed; its status says why.
bool LogFile::checkForChange() {
    TraceScope trace(anchor);
    const std::int64_t newEOF = lseek(LogFD, 0, SEEK_END);
    if (newEOF > LogEOF) {
        if (!m_guard.holds(LogFD)) {
            // This does not affect what is read. Only the ledger records it.
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

/// The file no longer holds the bytes that were read. It is followed from `newEnd` on.
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
    // The position where reading stopped. Text appended meanwhile counts only if it was read.
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

bool LogFile::offer(zrm_rmlogent_data_t* row) {
    if (!isFollowed()) {
        return waitAndOffer(row);
    }
    const EntryInstant instant(timeOf(*row));
    return waitAndOffer(row);
}

bool LogFile::waitAndOffer(zrm_rmlogent_data_t* row) {
    while (!EventRoom::mayOffer() ||
           (m_rowReceiver != nullptr && m_rowReceiver(row, 1) == tableNoRoom))
        [[unlikely]] {
            if (!waitForRoom(*this, m_pulse)) {
                if (!isFollowed()) {
                    notePassedOver(1); // a followed log continues here when it is monitored again
                }
                return false;
            }
        }
    return true;
}

bool LogFile::isReadingOver() noexcept {
    return monitorStatus() == MONITOR_STOPPED && hasWaitedEnough();
}

bool LogFile::hasWaitedEnough() noexcept {
    using Clock = std::chrono::steady_clock;
    if (m_end == Clock::time_point{}) {
        m_end = Clock::now() + std::chrono::seconds(1);
    }
    return Clock::now() >= m_end;
}

void LogFile::notePassedOver(std::uint64_t entries) noexcept {
    if (EventRoom::now() == EventRoom::State::CLOSED) {
        EventRoom::notePassedOver(entries);
    }
}

/// Counts the remaining lines, which are not offered because the process is ending.
void LogFile::passOverRest() {
    std::uint64_t entries = 0;
    const auto limit = std::chrono::steady_clock::now() + countingTime;
    while (EventRoom::now() == EventRoom::State::CLOSED && m_lineReader.next() != nullptr &&
           (++entries % 1024 != 0 || std::chrono::steady_clock::now() < limit)) {
    }
    notePassedOver(entries);
}

bool LogFile::deliverEntry(char* line) {
    zrm_rmlogent_data_t* const row = ownRow();
    count(NumEvents);
    const bool isRow = formatEntryAsRow(line, row, nullptr) == 0;
    if (isRow) {
        m_ledger.noteTime(row->entrytime[0]);
        if (!offer(row)) {
            return false;
        }
    } else {
        count(NumFormatErrors);
        m_ledger.noteRejected(line, rejectionReason());
    }
    if (std::FILE* const debugLog = debugLogStream()) {
        writeRecord(debugLog, line, std::strlen(line), isRow ? row : nullptr,
                    isRow ? sizeof *row : 0);
    } else {
        traceEntry();
    }
    return true;
}

long LogFile::readLog() {
    TraceScope trace(anchor);
    m_lineReader.start(LogFD);
    while (char* const line = m_lineReader.next()) {
        if (isReadingOver()) {
            return trace.result(0L);
        }
        if (!LogFile::deliverEntry(line)) {
            passOverRest();
            return trace.result(0L);
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

} // namespace zrm
