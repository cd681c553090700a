#ifndef ZRM_SYS_LOG_FILE_H
#define ZRM_SYS_LOG_FILE_H

#include "monitor/LogFile.h"

namespace zrm {

struct SyslogBufferInfo;

/// A file written by the system logger: lines of month, day, time, host, source and message, in
/// that order and without a year. The monitor starts with the object. Threads as in LogFile.
class SysLogFile : public LogFile {
public:
    SysLogFile(const ValidLog& log, LogFile* chainHead);
    using LogFile::operator=;
    ~SysLogFile() override;

    /// Closes the report's descriptor and frees its state (a SyslogBufferInfo).
    void endReportRequest(void** reportState) override;
    void* getNextLogEntry(void* row, void* reportState, void* thresholds) override;
    /// Returns a SyslogBufferInfo; null when the log is empty or cannot be read.
    void* startReportRequest(void* request) override;
    /// Always 0: a line that begins with no month gives a row with blank entry columns.
    long formatEntryAsRow(char* line, void* row, void* reportState) override;
    void processLogData() override;

protected:
    /// Prepares a log that is not monitored: no thread is started. For lines that are only tried.
    struct Unmonitored {};
    SysLogFile(const ValidLog& log, Unmonitored);

    /// Writes the 16 characters of ENTRYTIME, in the current year or, for a report, in the year
    /// that reading backwards has reached. Returns where the host field begins; the line's end,
    /// with `out` left as it was, when the line begins with no month or is too short for a time.
    char* formatEntryTime(char* out, char* line, void* reportState);
    /// Copies the host field and returns where the source field begins. A field that is longer
    /// than `max` loses one character and runs on, up to `limit`.
    char* extractSystem(char* out, char* text, unsigned int max, const char* limit);
    /// The same for the source field; a repeat notice has none and is all description.
    char* extractSource(char* out, char* text, unsigned int max, const char* limit);
    /// Frees the report's state and clears the caller's pointer.
    void deallocateReportBuffers(SyslogBufferInfo** reportState);

private:
    char* previousLine(SyslogBufferInfo& state);
    bool cutLongLine(SyslogBufferInfo& state);
    bool refill(SyslogBufferInfo& state);
};

} // namespace zrm

#endif
