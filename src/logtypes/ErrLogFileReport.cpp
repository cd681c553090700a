#include "logtypes/ErrLogFile.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"
#include "framework/cancellation.h"
#include "logs/RequestThresholds.h"
#include "logtypes/ChildProcess.h"
#include "monitor/ReportOutcome.h"

#include <cerrno>
#include <cstring>
#include <new>

#include <fcntl.h>
#include <poll.h>
#include <sys/wait.h>
#include <unistd.h>

namespace zrm {

namespace {

TRC1_Anchor anchor{"ErrLogFileReport.cpp"};

constexpr int lookInterval = 200; ///< milliseconds between checks that the report is still wanted
constexpr std::size_t commandLength = 34;
constexpr std::size_t argumentLength = 13; // option, ten digits, terminator
constexpr int execFailed = 255;            // the low byte of exit(-1)

const char* orEmpty(const char* argument) {
    return argument != nullptr ? argument : "";
}

} // namespace

void* ErrLogFile::startReportRequest(void* thresholds) {
    TraceScope trace(anchor);
    auto* const info = new (std::nothrow) ErrlogBufferInfo{};
    if (info == nullptr) {
        const ErrorText error(errno);
        trace.error()("Memory allocation for %d bytes failed. errno = %d; %s",
                      static_cast<int>(sizeof(ErrlogBufferInfo)), error.number(), error.text());
        return trace.result(static_cast<void*>(nullptr));
    }
    void* state = info;
    if (openPipe(info->pipeFds) == 0) {
        createChildForReport(info, static_cast<const _RequestThresholds*>(thresholds));
    }
    if (info->fp == nullptr) {
        endReportRequest(&state);
    }
    return trace.result(state);
}

void ErrLogFile::createChildForReport(ErrlogBufferInfo* info,
                                      const _RequestThresholds* thresholds) {
    TraceScope trace(anchor);
    char program[] = "errpt";
    char startArgument[argumentLength];
    char endArgument[argumentLength];
    char* argv[] = {program, startArgument, endArgument, nullptr};
    buildReportCommand(argv, thresholds);
    const ExecErrorTexts errorTexts;
    info->pid = fork();
    if (info->pid == 0) {
        runReportCommand(trace, info, argv, errorTexts);
    }
    const ErrorText forkError(errno);
    trace.detail()("Parent process closing write fd %d.", info->pipeFds[1]);
    close(info->pipeFds[1]);
    if (info->pid < 1) {
        trace.error()("Error creating child process for report on file %s. errno = %d; %s",
                      fileNameLocal(), forkError.number(), forkError.text());
        return;
    }
    trace.detail()("Child process created for report on file %s. pid = %d.", fileNameLocal(),
                   info->pid);
    fcntl(info->pipeFds[0], F_SETFL, O_NONBLOCK);
    info->fp = fdopen(info->pipeFds[0], "r");
    if (info->fp == nullptr) {
        const ErrorText error(errno);
        trace.error()("Error converting read pipe fd %d to file pointer for report on log file %s. "
                      "errno = %d; %s",
                      info->pipeFds[0], fileNameLocal(), error.number(), error.text());
        return;
    }
    info->command = new (std::nothrow) char[commandLength];
    if (info->command == nullptr) {
        const ErrorText error(errno);
        trace.error()("Memory allocation for %d bytes failed. errno = %d; %s",
                      static_cast<int>(commandLength), error.number(), error.text());
        return;
    }
    std::snprintf(info->command, commandLength, "%s %s %s", argv[0], orEmpty(argv[1]),
                  orEmpty(argv[2]));
}

void ErrLogFile::buildReportCommand(char** argv, const _RequestThresholds* thresholds) {
    TraceScope trace(anchor);
    if (thresholds->startTime[0] == '\0' || thresholds->endTime[0] == '\0') {
        argv[1] = nullptr;
        argv[2] = nullptr;
        return;
    }
    std::memcpy(argv[1], "-s", 2);
    timestamp2ErrlogTime(argv[1] + 2, thresholds->startTime);
    std::memcpy(argv[2], "-e", 2);
    timestamp2ErrlogTime(argv[2] + 2, thresholds->endTime);
}

void ErrLogFile::timestamp2ErrlogTime(char* dest, const char* timestamp) {
    TraceScope trace(anchor);
    std::memcpy(dest, timestamp + 3, 8);     // month, day, hour, minute
    std::memcpy(dest + 8, timestamp + 1, 2); // year
    dest[10] = '\0';
}

// The trace level was read before the fork: reading it now could wait for a lock.
void ErrLogFile::runReportCommand(const TraceScope& trace, const ErrlogBufferInfo* info,
                                  char** argv, const ExecErrorTexts& errorTexts) const {
    trace.detail()("Child process for report on file %s about to exec \"%s %s %s\"; redirecting fd "
                   "%d (stdout) to pipe; closing fd's %d & %d.",
                   fileNameLocal(), argv[0], orEmpty(argv[1]), orEmpty(argv[2]), STDOUT_FILENO,
                   info->pipeFds[0], info->pipeFds[1]);
    ChildProcess::redirectOutput(info->pipeFds);
    ChildProcess::restoreSignals();
    execvp(argv[0], argv);
    const int error = errno;
    trace.error()("Error executing command %s %s %s for report on file  %s. errno = %d; %s.  Use "
                  "the error number and message to investigate the failure.  Agent is "
                  "terminating.",
                  argv[0], orEmpty(argv[1]), orEmpty(argv[2]), fileNameLocal(), error,
                  errorTexts.text(error));
    // Skips the exit routine, which would destroy the parent's log manager.
    _exit(execFailed);
}

void* ErrLogFile::getNextLogEntry(void* row, void* reportState, void* /*thresholds*/) {
    TraceScope trace(anchor);
    auto* const info = static_cast<ErrlogBufferInfo*>(reportState);
    bool isRead = readReportLine(info);
    if (isRead && info->headerSkipped == 0) {
        info->headerSkipped = 1;
        isRead = readReportLine(info);
    }
    if (!isRead) {
        return trace.result(static_cast<void*>(nullptr));
    }
    if (formatEntryAsRow(info->line, row, nullptr) != 0) {
        trace.error()("Error while formatting line for report on file %s.", fileNameLocal());
        ReportOutcome::note(ReportEnd::notAnEntry);
        writeToDebugLog(info->line, std::strlen(info->line), nullptr, 0);
        return trace.result(static_cast<void*>(nullptr));
    }
    return trace.result(row);
}

bool ErrLogFile::readReportLine(ErrlogBufferInfo* info) const {
    TraceScope trace(anchor);
    // Like fgets, but the command may be silent for longer than the report is wanted.
    std::size_t length = 0;
    int character = 0;
    while (length < sizeof info->line - 1 && character != '\n') {
        character = getc_unlocked(info->fp);
        if (character != EOF) {
            info->line[length++] = static_cast<char>(character);
        } else if (std::ferror(info->fp) == 0 || errno != EAGAIN) {
            break;
        } else if (CTX1_IsCancelled()) {
            return trace.result(false);
        } else {
            std::clearerr(info->fp);
            pollfd output{fileno(info->fp), POLLIN, 0};
            poll(&output, 1, lookInterval);
        }
    }
    const ErrorText error(errno);
    info->line[length] = '\0';
    if (length > 0 && std::ferror(info->fp) == 0) {
        return trace.result(true);
    }
    if (std::ferror(info->fp) != 0) {
        ReportOutcome::note(ReportEnd::readError);
        // The message has a placeholder for the command, which is not passed. So name, number and
        // text each move one place to the left, and the last one stays empty.
        trace.error()("Error while reading file %s for report on file %d. errno = %s; %s",
                      fileNameLocal(), error.number(), error.text(), "");
    }
    return trace.result(false);
}

void ErrLogFile::endReportRequest(void** reportState) {
    TraceScope trace(anchor);
    auto* const info = static_cast<ErrlogBufferInfo*>(*reportState);
    if (info == nullptr) {
        return;
    }
    // Do this first, so that a command that is still writing gets a broken pipe and ends.
    if (info->fp != nullptr) {
        closePipe(&info->fp);
    } else if (info->pipeFds[0] >= 0) {
        closePipe(&info->pipeFds[0]);
    }
    if (info->pid > 0) {
        waitForReportChild(info);
    }
    delete[] info->command;
    delete info;
    *reportState = nullptr;
}

void ErrLogFile::waitForReportChild(const ErrlogBufferInfo* info) const {
    TraceScope trace(anchor);
    int status = 0;
    const pid_t ended = ChildProcess::waitFor(info->pid, &status);
    if (ended < 0) {
        const ErrorText error(errno);
        trace.error()("Error waiting for child report process %d to terminate for file %s.errno = "
                      "%d; %s",
                      info->pid, fileNameLocal(), error.number(), error.text());
        ReportOutcome::note(ReportEnd::commandFailed);
        return;
    }
    if (!WIFEXITED(status) || WEXITSTATUS(status) != 0) {
        ReportOutcome::note(ReportEnd::commandFailed);
    }
    if (ended == info->pid && (trace.isOn(TRC1_ERROR) || trace.isOn(TRC1_DETAIL))) {
        printChildStatus(ended, status, info->command);
    }
}

} // namespace zrm
