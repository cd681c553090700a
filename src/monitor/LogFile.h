#ifndef ZRM_LOG_FILE_H
#define ZRM_LOG_FILE_H

#include "framework/Pulse.h"
#include "logs/LogBase.h"
#include "logs/zrm_rmlogent_data.h"
#include "monitor/LineReader.h"
#include "monitor/LogBufferInfo.h"
#include "monitor/LogLedger.h"
#include "monitor/MonitorStatus.h"
#include "monitor/ReadGuard.h"

#include <atomic>
#include <chrono>
#include <cstdint>
#include <cstdio>
#include <ctime>

#include <pthread.h>
#include <sys/time.h>

namespace zrm {

class ValidLog;

/// One monitored log with one thread of its own, which tails it and turns new entries into Log
/// Entries rows; reports read it backwards on the threads of their requests. The log manager's
/// thread constructs, reconfigures and destroys it. The log types derive from it: their
/// constructors end with startThread, their destructors begin with stopThread.
class LogFile : public LogBase {
public:
    /// Takes fresh rows of a log, `count` of them, back to back, on the log's thread. It may write
    /// the columns of the thresholds. Returns TABLE_NO_ROOM when nothing was offered, since the
    /// framework has no room; other statuses do not concern the log.
    using RowReceiver = unsigned (*)(zrm_rmlogent_data_t* rows, int count);
    /// Names the receiver of the rows of all logs; with null they go nowhere. Called while no log
    /// has a thread.
    static void setRowReceiver(RowReceiver receiver) noexcept { m_rowReceiver = receiver; }
    /// Names the open debug log of all logs, or null. The stream stays open as long as a log that
    /// may write to it.
    static void setDebugLog(std::FILE* stream) noexcept;

    /// Copies the configuration line and joins the chain of logs behind `chainHead` (null: none).
    LogFile(const ValidLog& log, LogFile* chainHead);
    LogFile(const LogFile&) = delete;
    /// Takes over the debug mode of a changed line and restarts a monitor that is not running.
    LogFile& operator=(const ValidLog& log);

    // The virtual operations stand in slot order.

    ~LogFile() override;
    /// Ends a report, frees its state and clears the caller's pointer.
    virtual void endReportRequest(void** reportState) = 0;
    /// Fills `row` (zrm_rmlogent_data_t*) with the next older entry within the thresholds
    /// (_RequestThresholds*) and returns it; null at the report's end.
    virtual void* getNextLogEntry(void* row, void* reportState, void* thresholds) = 0;
    /// Opens the log for a report over the thresholds (_RequestThresholds*) and returns the
    /// report's state; null when the report cannot start.
    virtual void* startReportRequest(void* thresholds) = 0;
    /// Fills one row from one entry, a terminated line or one record; `context` is the report's
    /// state, null while monitoring. 0 when the row is built, non-zero when the entry is rejected.
    /// Every byte of the row is written: it may still hold the entry before.
    virtual long formatEntryAsRow(char* entry, void* row, void* context) = 0;
    /// The body of the monitoring thread: open, seek to the end, wait loop, close.
    virtual void processLogData() = 0;
    /// Consumes everything between LogEOF and the end of the file; 0, or -1 on a read error.
    virtual long readLog();

    void startThread();
    /// Lets a running monitor end by itself, so that stopThread waits less: each thread looks at
    /// its status once a second, and many are to end at once.
    void askToStop() noexcept;
    /// Ends the monitoring thread and joins it; at once when no thread was ever started.
    void stopThread();
    void setMonitorStatus(_MonitorStatus status);
    /// Copies the status text, at most `bufferLength` bytes, without a terminator. Any thread.
    void getMonitorStatus(char* buffer, long bufferLength) const;
    void printSelf() const;

    // Read by the tables on their own threads.
    _MonitorStatus monitorStatus() const noexcept { return MonitorStatus.load(); }
    std::int64_t numEvents() const noexcept { return NumEvents.load(); }
    std::int64_t numFormatErrors() const noexcept { return NumFormatErrors.load(); }
    std::time_t monitorStartStopTime() const noexcept { return MonitorStartStopTime.load(); }
    const LogLedger& ledger() const noexcept { return m_ledger; }

    // The log manager's mark of logs that a new configuration no longer names.
    bool isMarked() const noexcept { return RefreshMode; }
    void setMarked(bool marked) noexcept { RefreshMode = marked; }

    LogFile* next() const noexcept { return static_cast<LogFile*>(Next); }

protected:
    void lockLog() const;
    void unlockLog() const;
    void openLogAndSeek();
    void noteOpenFile();
    void closeLog();
    /// Remembers the bytes in front of LogEOF; the log's thread.
    void guardEnd() noexcept;
    void waitForEventLoop(timeval interval);
    /// Offers a row to the situations, once the framework has room. False when the log is to end or
    /// the process is ending before it has: then nothing was offered, and the entry counts as
    /// passed over.
    bool offer(zrm_rmlogent_data_t* row);
    /// Further entries were passed over since the process is ending; counts them if it is.
    static void notePassedOver(std::uint64_t entries) noexcept;
    /// True when the log is to end and has had a second for what stood in it: a log may grow faster
    /// than it is read. For every loop over entries.
    bool isReadingOver() noexcept;
    /// Counts one more; the log's thread alone.
    static void count(std::atomic<std::int64_t>& counter) noexcept;
    /// Fills the columns that all kinds of logs share, in a row that is blank there.
    void fillCommonColumns(zrm_rmlogent_data_t* row) const;
    /// The row in which the log's thread offers its entries.
    zrm_rmlogent_data_t* ownRow() noexcept { return &m_row; }
    /// Makes `row` blank but for the common columns. The log's own row has kept its common columns
    /// from the line before and costs less.
    void prepareRow(zrm_rmlogent_data_t* row);
    /// Says that a built row has so many characters in ENTRYDESC and UENTRYDESC and no text that
    /// ran out of its column, so that the row of the next entry is blanked no further. Without this
    /// it is blanked to the ends of the columns.
    void noteDescriptions(const zrm_rmlogent_data_t* row, std::size_t length,
                          std::int32_t lengthInUTF8) noexcept;
    /// Puts the common columns into a prepared row again, over a field that has run into them.
    void repairRow(zrm_rmlogent_data_t* row);
    /// Makes a prepared row all blank: its entry is rejected.
    void dropRow(zrm_rmlogent_data_t* row);

    // The debug log, shared by all logs.
    static void lockDebugFile(const char* who);
    static void unlockDebugFile();
    void writeToDebugLog(const void* data1, unsigned long length1, const void* data2,
                         unsigned long length2);

    // Reading backwards for reports, on the request's thread.
    unsigned char determineOptimumBlockSize();
    long openLogForReport(_LogBufferInfo* info);
    long fillReportBuffer(_LogBufferInfo* info);
    void closeLogForReport(int fd);

    bool RefreshMode = false;
    // The thread owns the open file and the counters; a dump may read them on another thread.
    std::atomic<std::FILE*> LogFileP{nullptr};
    std::atomic<_MonitorStatus> MonitorStatus{MONITOR_NOT_STARTED};
    std::atomic<std::int64_t> LogEOF{-1};
    pthread_t LogThread{};
    mutable pthread_mutex_t LogLock;
    std::atomic<int> LogFD{-1};
    std::atomic<std::int64_t> NumEvents{0};
    std::atomic<std::int64_t> NumFormatErrors{0};
    std::atomic<std::time_t> MonitorStartStopTime;
    std::atomic<std::int64_t> OptimumBlockSize{0};

    static pthread_mutex_t m_debugFileLock;
    Pulse m_pulse{fileNameUTF8(), &NumEvents};
    static std::atomic<std::FILE*> m_debugLog;
    LogLedger m_ledger; ///< lives as long as the object: through every refresh that keeps it

private:
    friend void* logThread(void* logFile);

    void initializeLock();
    void fillChangingColumns(zrm_rmlogent_data_t* row) const;
    bool checkForChange();
    bool readGrowth();
    void noteTruncated(std::int64_t newEnd, LogLedger::Truncation kind);
    void pushBack(_LogBufferInfo* info);
    std::FILE* debugLogStream() const;
    void writeRecord(std::FILE* stream, const void* data1, unsigned long length1, const void* data2,
                     unsigned long length2);
    void traceEntry() const;

    void passOverRest();
    bool hasWaitedEnough() noexcept;

    static inline RowReceiver m_rowReceiver = nullptr;

    bool m_hasThread = false; ///< LogThread is to be joined; only those who start and stop use it
    // The thread's.
    std::chrono::steady_clock::time_point m_end{}; ///< of reading a log that is to end
    LineReader m_lineReader;
    ReadGuard m_guard;
    zrm_rmlogent_data_t m_row{};
    bool m_isRowPrepared = false;        ///< m_row's common columns stand
    std::size_t m_descriptionLength = 0; ///< characters of m_row's ENTRYDESC that may not be blank
    std::size_t m_descriptionLengthInUTF8 = 0; ///< and of its UENTRYDESC
};

/// The monitoring thread's start routine; its argument is the LogFile.
void* logThread(void* logFile);

} // namespace zrm

#endif
