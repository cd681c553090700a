#ifndef ZRM_ERR_LOG_FILE_H
#define ZRM_ERR_LOG_FILE_H

#include "monitor/LogFile.h"

#include <atomic>
#include <cstdint>
#include <cstdio>
#include <string_view>

#include <sys/types.h>

namespace zrm {

class ExecErrorTexts;
class TraceScope;
struct _RequestThresholds;
struct zrm_rmlogent_data_t;

/// The state of one report on an error log: the child that runs the report command, and the pipe
/// that carries its output.
struct ErrlogBufferInfo {
    std::uint8_t headerSkipped; ///< 1 once the column header was read and dropped
    char line[256];             ///< the last line read, terminated
    char* command;              ///< the command as run, for messages; owned, null if memory ran out
    std::FILE* fp;              ///< the pipe's read end; null until the child runs
    std::int32_t pid;           ///< 0 until the fork
    std::int32_t pipeFds[2];    ///< read end, write end
};
static_assert(sizeof(ErrlogBufferInfo) == 296);

/// The system's error log, read through a command. While the log is monitored, one child runs the
/// configured command, and every line of its output becomes a row. The child leads its own
/// process group, which ends with the monitor. Each report runs its own child on the request's
/// thread.
class ErrLogFile : public LogFile {
public:
    ErrLogFile(const ValidLog& log, LogFile* chainHead);
    ~ErrLogFile() override;

    /// Ends the report: closes the pipe, so that a command that is still writing ends by itself,
    /// and waits for the child.
    void endReportRequest(void** reportState) override;
    /// Returns the command's next line. The window was passed to the command and is not
    /// checked again. A line that is not an entry ends the report.
    void* getNextLogEntry(void* row, void* reportState, void* thresholds) override;
    /// The report's state is an ErrlogBufferInfo.
    void* startReportRequest(void* thresholds) override;
    /// Fills the row from a terminated line. Returns non-zero if the line is not an entry.
    long formatEntryAsRow(char* entry, void* row, void* context) override;
    /// Runs the command once, until its output ends, an error occurs or the monitor is stopped.
    /// Then sends the child signal 15 and waits for it to end, however long that takes.
    void processLogData() override;
    /// Reads the lines available in the pipe. Returns 0, or -1 at the end of the output or on a
    /// read error. Returns early if the monitor is stopped: a command may write forever.
    long readLog() override;

    /// Traces how a child ended; `command` may be null. Any thread.
    void printChildStatus(pid_t pid, int status, const char* command) const;
    /// Converts a 16-character time stamp to the 10 characters MMDDhhmmYY and a terminator.
    static void timestamp2ErrlogTime(char* dest, const char* timestamp);
    /// Writes the 16-character time stamp of a line. Returns the position of the fields after the
    /// time, or null if the line is not an entry. Years below 70 are in the 21st century.
    static const char* formatEntryTime(char* dest, const char* line);
    /// Copies the field at `position` and returns the position of the next field. The character
    /// after the first `maximum` characters is dropped. Any further characters are copied too, over
    /// whatever follows in the row, but never at or past `end`.
    static const char* extractNextField(char* dest, const char* position, unsigned long maximum,
                                        const char* end);
    /// Writes the identifier and description, at most `size` bytes, without a terminator. The last
    /// character of `rest` is dropped: it is the newline of a complete line.
    static void formatDescription(char* dest, const char* line, const char* rest,
                                  unsigned long size, int toUtf8);

private:
    /// The local time in the format of the command's placeholder, computed before the fork.
    struct StartDate {
        char text[11];
        bool failed;
    };

    long openPipe(int fds[2]);
    void createChild(const int fds[2]);
    [[noreturn]] void runCommand(const TraceScope& trace, const int fds[2], const StartDate& date,
                                 const ExecErrorTexts& errorTexts);
    static StartDate startDate();
    void substituteStartDate(const TraceScope& trace, const StartDate& date);
    void convertReadFD();
    void waitForEventLoop();
    bool readLine();
    void deliverLine();
    void killChild();
    static void closePipe(int* fd);
    static void closePipe(std::FILE** stream);

    void createChildForReport(ErrlogBufferInfo* info, const _RequestThresholds* thresholds);
    static void buildReportCommand(char** argv, const _RequestThresholds* thresholds);
    [[noreturn]] void runReportCommand(const TraceScope& trace, const ErrlogBufferInfo* info,
                                       char** argv, const ExecErrorTexts& errorTexts) const;
    bool readReportLine(ErrlogBufferInfo* info) const;
    void waitForReportChild(const ErrlogBufferInfo* info) const;

    int m_readFd = -1;
    std::atomic<pid_t> m_childPid{0}; ///< also read by reports, to tell their own child from it
    std::FILE* m_readStream = nullptr;
    char m_line[256]; ///< the last line read, or the part of the next line received so far
    std::size_t m_lineLength = 0;
};

} // namespace zrm

#endif
