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
struct _EntryTimeBuffers;

/// The state of one report on a user log. Besides the reading state it holds a date, initially
/// today, then that of the last entry read. It supplies the year for entries without one.
struct UserlogBufferInfo : _LogBufferInfo {
    long century; ///< 1 for the years 2000 to 2069, 0 for 1970 to 1999
    long year;    ///< two digits
    long month;
    long day;
    std::unique_ptr<char[]> block; ///< owns what pBuffer points to
};

/// A text log whose configured format specifier defines the line layout. The monitoring thread
/// learns the format once. Monitoring starts on construction. Threads as in LogFile. Reports format
/// lines while the monitor does, so a lock guards what a line changes.
class UserLogFile : public LogFile {
public:
    UserLogFile(const ValidLog& log, LogFile* chainHead);
    using LogFile::operator=;
    ~UserLogFile() override;

    /// Closes the report's descriptor and frees its state (a UserlogBufferInfo).
    void endReportRequest(void** bufferInfo) override;
    /// Returns null at the first entry older than the window, at the start of the log, at a line
    /// longer than 2047 characters, and after more than 10 bad lines in a row.
    void* getNextLogEntry(void* row, void* bufferInfo, void* thresholds) override;
    /// Returns a UserlogBufferInfo, or null if the format is not known (yet) or the log is empty or
    /// cannot be read.
    void* startReportRequest(void* request) override;
    /// Returns 0, or -1 for a line that does not match the format or has no valid time.
    long formatEntryAsRow(char* line, void* row, void* reportContext) override;
    void processLogData() override;

    void printSelf() const;

    /// The field names that a format may use.
    static const _KeywordFields* fields() noexcept;
    /// The same for a log that is followed: these and "zone".
    static const _KeywordFields* followedFields() noexcept;

protected:
    /// Creates a log that is not monitored and starts no thread. Used to try out lines.
    struct Unmonitored {};
    UserLogFile(const ValidLog& log, Unmonitored);

    /// Writes the 16 characters of ENTRYTIME. Parts missing from the texts come from the report's
    /// date (the year only) or the clock. Returns 0 or -1. The caller holds the lock of the chain.
    long formatEntryTime(char* entryTime, _EntryTimeBuffers* texts, void* reportContext);
    /// Frees the report's state and clears the caller's pointer.
    void deallocateReportBuffers(UserlogBufferInfo** bufferInfo);

    std::unique_ptr<StringParser> SPAnchor; ///< the learned format; null until then
    bool NumericMonth = true;               ///< the last month was a number, not a name

private:
    void readYear(const char* text, EntryTime& time) const;
    void readMonth(const char* text, EntryTime& time);
    bool readMonthNumber(const char* text, EntryTime& time) const;
    void readDay(const char* text, EntryTime& time) const;
    void readHour(const char* text, EntryTime& time) const;
    void readMinute(const char* text, EntryTime& time) const;
    void readSecond(const char* text, EntryTime& time) const;
    void convertToLocalTime(const char* zone, EntryTime& time) const;
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
