#ifndef ZRM_SYS_LOG_FILE_H
#define ZRM_SYS_LOG_FILE_H

#include "logtypes/SyslogClock.h"
#include "monitor/LogFile.h"

#include <memory>

namespace zrm {

/// The state of one report on a syslog file.
struct SyslogBufferInfo : _LogBufferInfo {
    /// ENTRYTIME of the last formatted entry, initially the time at which the report started.
    /// Determines the year of the entries before it.
    char timestamp[16];
    std::unique_ptr<char[]> block; ///< owns what pBuffer points to
};

/// A file written by the system logger: lines with month, day, time, host, source and message, in
/// this order and without a year. A log that is followed may have other forms of lines
/// (SyslogForms) as well. Monitoring starts on construction. Threads as in LogFile.
class SysLogFile : public LogFile {
public:
    SysLogFile(const ValidLog& log, LogFile* chainHead);
    using LogFile::operator=;
    ~SysLogFile() override;

    /// Closes the report's descriptor and frees its state (a SyslogBufferInfo).
    void endReportRequest(void** reportState) override;
    void* getNextLogEntry(void* row, void* reportState, void* thresholds) override;
    /// Returns a SyslogBufferInfo, or null if the log is empty or cannot be read.
    void* startReportRequest(void* request) override;
    /// Always returns 0. A line that does not begin with a month leaves the entry columns blank.
    long formatEntryAsRow(char* line, void* row, void* reportState) override;
    void processLogData() override;
    /// See SyslogFields.
    void readFields(std::string_view text, EntryFields& fields) const override;

protected:
    /// Creates a log that is not monitored and starts no thread. Used to try out lines.
    struct Unmonitored {};
    SysLogFile(const ValidLog& log, Unmonitored);

    /// Writes the 16 characters of ENTRYTIME, with the current year or, in a report, the year
    /// reached by reading backwards. Returns the start of the host field. A line without a month or
    /// too short for a time leaves `out` unchanged, and the end of the line is returned.
    char* formatEntryTime(char* out, char* line, void* reportState);
    /// Copies the host field and returns the start of the source field. A field longer than `max`
    /// loses one character and continues up to `limit`.
    char* extractSystem(char* out, char* text, unsigned int max, const char* limit);
    /// Does the same for the source field. A repeat notice has none and is all description.
    char* extractSource(char* out, char* text, unsigned int max, const char* limit);
    /// Frees the report's state and clears the caller's pointer.
    void deallocateReportBuffers(SyslogBufferInfo** reportState);

private:
    // For a log that is followed.
    char* formatFollowedTime(char* out, char* line, void* reportState) const;
    long formatFollowedEntry(char* line, EntryRow& row, void* reportState);

    char* previousLine(SyslogBufferInfo& state);
    bool cutLongLine(SyslogBufferInfo& state);
    bool refill(SyslogBufferInfo& state);

    SyslogClock m_lineClock; ///< of a log that is followed; only for the log's own row
};

} // namespace zrm

#endif
