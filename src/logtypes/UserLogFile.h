#ifndef ZRM_USER_LOG_FILE_H
#define ZRM_USER_LOG_FILE_H

#include "framework/locks.h"
#include "monitor/LogFile.h"

#include <cstdint>
#include <memory>

namespace zrm {

class StringParser;
struct _KeywordFields;
struct EntryTime;
struct UserlogBufferInfo;
struct _EntryTimeBuffers;

/// A text log whose lines are laid out as its configuration's format specifier says. The monitoring
/// thread learns the format, once; the monitor starts with the object. Threads as in LogFile:
/// reports format lines while the monitor does, so a lock guards what a line changes.
class UserLogFile : public LogFile {
public:
    UserLogFile(const ValidLog& log, LogFile* chainHead);
    using LogFile::operator=;
    ~UserLogFile() override;

    /// Closes the report's descriptor and frees its state (a UserlogBufferInfo).
    void endReportRequest(void** bufferInfo) override;
    /// Null at the first entry older than the window, at the log's beginning, at a line of more
    /// than 2047 characters, and behind more than 10 bad lines in a row.
    void* getNextLogEntry(void* row, void* bufferInfo, void* thresholds) override;
    /// Returns a UserlogBufferInfo; null when the format is not known (yet) or the log is empty or
    /// cannot be read.
    void* startReportRequest(void* request) override;
    /// 0, or -1 for a line that does not fit the format or whose time cannot be told.
    long formatEntryAsRow(char* line, void* row, void* reportContext) override;
    void processLogData() override;

    void printSelf() const;

    /// The names that a format may give its fields.
    static const _KeywordFields* fields() noexcept;

protected:
    /// Prepares a log that is not monitored: no thread is started. For lines that are only tried.
    struct Unmonitored {};
    UserLogFile(const ValidLog& log, Unmonitored);

    /// Writes the 16 characters of ENTRYTIME; what the texts do not tell is taken from the report's
    /// date (the year alone) or the clock. 0 or -1. The caller holds the lock of the chain.
    long formatEntryTime(char* entryTime, _EntryTimeBuffers* texts, void* reportContext);
    /// Frees the report's state and clears the caller's pointer.
    void deallocateReportBuffers(UserlogBufferInfo** bufferInfo);

    std::unique_ptr<StringParser> SPAnchor; ///< the learned format; null until it is learned
    bool NumericMonth = true;               ///< months were numbers, not names, the last time

private:
    void readYear(const char* text, EntryTime& time) const;
    void readMonth(const char* text, EntryTime& time);
    bool readMonthNumber(const char* text, EntryTime& time) const;
    void readDay(const char* text, EntryTime& time) const;
    void readHour(const char* text, EntryTime& time) const;
    void readMinute(const char* text, EntryTime& time) const;
    void readSecond(const char* text, EntryTime& time) const;
    bool hasFormat() const;
    void learnFormat();
    bool allocateReportBuffers(UserlogBufferInfo** bufferInfo);
    bool setDateContext(UserlogBufferInfo& info) const;
    char* previousLine(UserlogBufferInfo& info);
    char* endAtLongLine(UserlogBufferInfo& info, std::int64_t limit) const;
    bool refill(UserlogBufferInfo& info);

    /// Guards SPAnchor, the receiving variables of its chain, and NumericMonth.
    mutable SYS1_Lock m_chainLock;
};

} // namespace zrm

#endif
