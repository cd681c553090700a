#ifndef ZRM_LOG_FILE_H
#define ZRM_LOG_FILE_H

#include "framework/Pulse.h"
#include "logs/EntryClock.h"
#include "logs/LogBase.h"
#include "logs/zrm_rmlogent_data.h"
#include "monitor/EntryRow.h"
#include "monitor/LineReader.h"
#include "monitor/LogLedger.h"
#include "monitor/MonitorStatus.h"
#include "monitor/ReadGuard.h"

#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <ctime>
#include <string_view>

#include <pthread.h>
#include <sys/time.h>

namespace zrm {

class EntryFields;
class FileFollower;
class FollowedEntry;
class FollowLedger;
class LogPositions;
class ValidLog;

/// The state of one report that reads a log backwards, block by block. Owned by the log type's
/// report state. The descriptor is positioned at the start of the last block read (right after
/// opening, at the end of the file).
struct _LogBufferInfo {
    char* pBuffer;            ///< the block, owned by the log type
    std::int64_t bytesLeft;   ///< unread bytes before the block
    std::int64_t bufferCount; ///< after a fill, the bytes read; before the next fill, the bytes at
                              ///< the start of the block not yet consumed, which are pushed back
    std::int32_t fd;          ///< the report's descriptor; -1: none
    /// Capacity of pBuffer in bytes, without the terminator; 0: the log's OptimumBlockSize. Another
    /// report may change OptimumBlockSize while this one reads.
    std::int64_t blockSize = 0;
};

/// A monitored log with its own thread, which follows the file and turns new entries into Log
/// Entries rows. Reports read the log backwards on the threads of their requests. The log manager's
/// thread constructs, reconfigures and destroys it. Log types derive from this class; their
/// constructors must end with startThread and their destructors begin with stopThread.
class LogFile : public LogBase {
public:
    /// Receives `count` new rows of a log, contiguous, on the log's thread. It may write the
    /// threshold columns. Returns tableNoRoom if nothing was offered because the framework has no
    /// room. The log ignores all other statuses.
    using RowReceiver = unsigned (*)(zrm_rmlogent_data_t* rows, int count);
    /// Sets the receiver of the rows of all logs; null discards them. Call it while no log has a
    /// thread.
    static void setRowReceiver(RowReceiver receiver) noexcept { m_rowReceiver = receiver; }
    /// Counts entries that were judged before the log's thread began, so that thresholds go on
    /// where an earlier run ended. Nothing is raised for them.
    struct EarlierReceiver {
        /// The longest period, in seconds, in which a situation on the log counts entries; 0: none
        /// does. The row has the columns of the log.
        std::int64_t (*period)(zrm_rmlogent_data_t& row);
        void (*count)(zrm_rmlogent_data_t& row);
    };
    /// Call it while no log has a thread.
    static void setEarlierReceiver(const EarlierReceiver& receiver) noexcept {
        m_earlierReceiver = receiver;
    }
    /// Sets the open debug log of all logs, or null. The stream must stay open as long as any log
    /// that may write to it exists.
    static void setDebugLog(std::FILE* stream) noexcept;
    /// Number of records since the start that the debug log did not take whole. Any thread.
    static std::uint64_t incompleteDebugRecords() noexcept;

    /// Copies the configuration line and joins the chain of logs after `chainHead` (null: none).
    LogFile(const ValidLog& log, LogFile* chainHead);
    LogFile(const LogFile&) = delete;
    /// Applies the debug mode of a changed line and restarts a monitor that is not running.
    LogFile& operator=(const ValidLog& log);

    // The virtual functions are in slot order.

    ~LogFile() override;
    /// Ends a report, frees its state and clears the caller's pointer.
    virtual void endReportRequest(void** reportState) = 0;
    /// Fills `row` (zrm_rmlogent_data_t*) with the next older entry within the thresholds
    /// (_RequestThresholds*) and returns it, or null at the end of the report.
    virtual void* getNextLogEntry(void* row, void* reportState, void* thresholds) = 0;
    /// Opens the log for a report with the thresholds (_RequestThresholds*) and returns the
    /// report's state, or null if the report cannot start.
    virtual void* startReportRequest(void* thresholds) = 0;
    /// Fills one row from one entry, which is a terminated line or a record. `context` is the
    /// report's state, or null while monitoring. Returns 0 if the row is built, non-zero if the
    /// entry is rejected. Writes every byte of the row, whatever it holds (see EntryRow).
    virtual long formatEntryAsRow(char* entry, void* row, void* context) = 0;
    /// The body of the monitoring thread: open, seek to the end, loop, close.
    virtual void processLogData() = 0;
    /// Reads everything between LogEOF and the end of the file. Returns 0, or -1 on a read error.
    virtual long readLog();

    /// Judges one entry as the log's thread does: counts it and offers its row. False if the log
    /// has to end or the process is ending before the row could be offered.
    virtual bool deliverEntry(char* entry);

    /// Adds the fields of an entry, given its text (see LogEntry). A kind of log whose entries have
    /// no fields adds none. The fields are views into the text. Any thread.
    virtual void readFields(std::string_view text, EntryFields& fields) const;

    /// Why the calling thread's last entry was rejected, as a clause; empty: it does not match the
    /// format.
    virtual std::string_view rejectionReason() const noexcept { return {}; }

    void startThread();
    /// Asks a running monitor to end, so that stopThread waits less: each thread checks its status
    /// once a second, and many may have to end at once.
    void askToStop() noexcept;
    /// Ends the monitoring thread and joins it. Returns immediately if no thread was started.
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
    /// Null for a log of the log configuration.
    const FollowLedger* followLedger() const noexcept { return m_followLedger.get(); }

    // The log manager marks logs that a new configuration no longer contains.
    bool isMarked() const noexcept { return RefreshMode; }
    void setMarked(bool marked) noexcept { RefreshMode = marked; }

    LogFile* next() const noexcept { return static_cast<LogFile*>(Next); }

protected:
    void lockLog() const;
    void unlockLog() const;
    void openLogAndSeek();
    void noteOpenFile();
    void closeLog();
    /// Remembers the bytes before LogEOF. Log's thread only.
    void guardEnd() noexcept;
    void waitForEventLoop(timeval interval);
    /// True if the log is followed through rotations and restarts.
    bool isFollowed() const noexcept { return followSettings() != nullptr; }
    /// The body of the monitoring thread of such a log: returns when the log has to end. Bytes of a
    /// record; 0: its entries are lines.
    void followLog(std::size_t recordLength);
    /// Waits for room and offers a row to the situations, right after formatting it. Returns false
    /// if the log has to end or the process is ending before there is room. Then nothing was
    /// offered, and the entry counts as skipped.
    bool offer(zrm_rmlogent_data_t* row);
    /// Counts an entry of a followed log again that an earlier run has judged, so that thresholds
    /// go on; nothing is raised for it. `row` is the log's own, made just before.
    void countEarlier(zrm_rmlogent_data_t& row);
    /// The longest period, in seconds, in which a situation on the log counts entries; 0: none
    /// does. Waits until the situations are open. Log's thread only.
    std::int64_t earlierPeriod();
    /// Counts further entries as skipped if the process is ending.
    static void notePassedOver(std::uint64_t entries) noexcept;
    /// True if the log has to end and had a second to read what was left. A log may grow faster
    /// than it is read. Check it in every loop over entries.
    bool isReadingOver() noexcept;
    /// Increments a counter. Log's thread only.
    static void count(std::atomic<std::int64_t>& counter) noexcept;
    /// Fills the columns common to all kinds of logs, in a row whose common columns are blank.
    void fillCommonColumns(zrm_rmlogent_data_t* row) const;
    /// Converts a text of an entry, which is in the local code page, for a column in UTF-8. Returns
    /// the number of bytes written.
    template <std::size_t width>
    std::int32_t columnToUTF8(char (&column)[width], std::string_view text) const {
        return columnToUTF8(column, width, text);
    }
    template <std::size_t width, std::size_t localWidth>
    std::int32_t columnToUTF8(char (&column)[width], const char (&local)[localWidth]) const {
        return columnToUTF8(column, width, {local, localWidth});
    }
    /// The row in which the log's thread offers its entries.
    zrm_rmlogent_data_t* ownRow() noexcept { return m_ownRow.columns(); }

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
    // The thread owns the open file and the counters. A dump may read them on another thread.
    /// What reads the lines of the open log; null while it is closed, and in logs of records.
    std::atomic<LineReader*> LogFileP{nullptr};
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
    LogLedger m_ledger; ///< lives as long as the object, across every refresh that keeps it
    const std::unique_ptr<FollowLedger> m_followLedger; ///< of a followed log

private:
    friend void* logThread(void* logFile);
    friend class EntryRow;

    void initializeLock();
    std::int32_t columnToUTF8(char* column, std::size_t room, std::string_view text) const;
    static void fillChangingColumns(zrm_rmlogent_data_t* row);
    bool waitAndOffer(zrm_rmlogent_data_t* row);
    bool checkForChange();
    bool readGrowth();
    std::int64_t timeOf(zrm_rmlogent_data_t& row);
    void noteMissingTime();
    void recount(FileFollower& follower, std::size_t recordLength);
    bool readEntries(FileFollower& follower, LogPositions& positions, FollowedEntry& current);
    void noteFollowed(FileFollower& follower, LogPositions& positions);
    void endFollowing(FileFollower& follower, LogPositions& positions);
    void noteFollowFailure();
    void noteTruncated(std::int64_t newEnd, LogLedger::Truncation kind);
    void pushBack(_LogBufferInfo* info);
    std::FILE* debugLogStream() const;
    void writeRecord(std::FILE* stream, const void* data1, unsigned long length1, const void* data2,
                     unsigned long length2);
    void traceEntry() const;

    void passOverRest();
    bool hasWaitedEnough() noexcept;

    static inline RowReceiver m_rowReceiver = nullptr;
    static inline EarlierReceiver m_earlierReceiver{};

    bool m_hasThread = false; ///< LogThread must be joined; used only when starting and stopping
    // Used by the log's thread only.
    std::chrono::steady_clock::time_point m_end{}; ///< when a log that has to end stops reading
    bool m_isFailureTraced = false;
    bool m_isMissingTimeTraced = false;
    EntryClock m_clock{followSettings()}; ///< of a followed log
    LineReader m_lineReader;
    ReadGuard m_guard;
    OwnRow m_ownRow;
};

/// The monitoring thread's start routine; its argument is the LogFile.
void* logThread(void* logFile);

} // namespace zrm

#endif
