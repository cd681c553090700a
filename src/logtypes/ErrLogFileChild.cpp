#include "logtypes/ErrLogFile.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"
#include "logtypes/ChildProcess.h"

#include <cerrno>
#include <csignal>
#include <cstring>
#include <ctime>

#include <fcntl.h>
#include <sys/wait.h>
#include <unistd.h>

namespace zrm {

namespace {

TRC1_Anchor anchor{"ErrLogFileChild.cpp"};

constexpr const char* shell = "/bin/sh";
constexpr const char* shellOption = "-c";
constexpr const char* placeholder = "mmddhhmmyy";
constexpr std::size_t placeholderLength = 10;
constexpr int execFailed = 255; // the low byte of exit(-1)

} // namespace

long ErrLogFile::openPipe(int fds[2]) {
    TraceScope trace(anchor);
    if (ChildProcess::openPipe(fds) != 0) {
        const ErrorText error(errno);
        trace.error()("Error creating pipe for file %s. errno = %d; %s", fileNameLocal(),
                      error.number(), error.text());
        fds[0] = -1;
        fds[1] = -1;
        setMonitorStatus(MONITOR_ERR_CREATE_PIPE);
        return trace.result(-1L);
    }
    trace.detail()("Pipe opened successfully for file %s; read fd = %d; write fd = %d",
                   fileNameLocal(), fds[0], fds[1]);
    return trace.result(0L);
}

void ErrLogFile::createChild(const int fds[2]) {
    TraceScope trace(anchor);
    const StartDate date = startDate();
    const ExecErrorTexts errorTexts;
    const pid_t pid = fork();
    if (pid == 0) {
        runCommand(trace, fds, date, errorTexts);
    }
    const ErrorText error(errno);
    m_childPid = pid;
    trace.detail()("Parent process closing write fd %d.", fds[1]);
    close(fds[1]);
    if (pid < 1) {
        trace.error()("Error creating child process for file %s. errno = %d; %s", fileNameLocal(),
                      error.number(), error.text());
        setMonitorStatus(MONITOR_ERR_CREATE_CHILD);
        return;
    }
    // The child does the same. Whichever runs first, the group exists before it is needed.
    setpgid(pid, pid);
    trace.detail()("Child process created for file %s. pid = %d.", fileNameLocal(),
                   static_cast<int>(pid));
    convertReadFD();
}

// The trace level was read before the fork: reading it now could wait for a lock.
void ErrLogFile::runCommand(const TraceScope& trace, const int fds[2], const StartDate& date,
                            const ExecErrorTexts& errorTexts) {
    setpgid(0, 0);
    substituteStartDate(trace, date);
    trace.detail()("Child process for file %s about to exec \"%s %s %s\"; redirecting fd %d "
                   "(stdout) to pipe; closing fd's %d & %d.",
                   fileNameLocal(), shell, shellOption, procedure(), STDOUT_FILENO, fds[0], fds[1]);
    ChildProcess::redirectOutput(fds);
    ChildProcess::restoreSignals();
    execl(shell, shell, shellOption, procedure(), static_cast<char*>(nullptr));
    const int error = errno;
    trace.error()("Error executing command %s for file %s. errno = %d; %s.  Use the error number "
                  "and message to investigate the failure.  Agent is terminating.",
                  procedure(), fileNameLocal(), error, errorTexts.text(error));
    // Skips the exit routine, which would destroy the parent's log manager.
    _exit(execFailed);
}

ErrLogFile::StartDate ErrLogFile::startDate() {
    TraceScope trace(anchor);
    StartDate date{};
    const std::time_t now = std::time(nullptr);
    std::tm local{};
    if (localtime_r(&now, &local) == nullptr) {
        date.failed = true;
        local = {};
        local.tm_mon = -1;
    }
    // At least two digits each; %.2d is equivalent to %0.2d.
    char text[64];
    std::snprintf(text, sizeof text, "%.2d%.2d%.2d%.2d%.2d", local.tm_mon + 1, local.tm_mday,
                  local.tm_hour, local.tm_min, local.tm_year % 100);
    std::memcpy(date.text, text, placeholderLength);
    return date;
}

// Edits the child's copy of the command. The parent's keeps its placeholder for the next start.
void ErrLogFile::substituteStartDate(const TraceScope& trace, const StartDate& date) {
    char* const found = LogProcedure ? std::strstr(LogProcedure.get(), placeholder) : nullptr;
    if (found == nullptr) {
        return;
    }
    if (date.failed) {
        trace.error()("Error deriving local time. Setting start time to zero.");
    }
    std::memcpy(found, date.text, placeholderLength);
    trace.detail()("Command for file %s changed to %s.", fileNameLocal(), procedure());
}

void ErrLogFile::convertReadFD() {
    TraceScope trace(anchor);
    const int flags = fcntl(m_readFd, F_GETFL, 0);
    if (flags == -1) {
        const ErrorText error(errno);
        trace.error()("Error while getting flag for pipe %d for file %s. errno = %d; %s", m_readFd,
                      fileNameLocal(), error.number(), error.text());
        setMonitorStatus(MONITOR_ERR_GET_PIPE_FLAG);
        return;
    }
    if (fcntl(m_readFd, F_SETFL, flags | O_NONBLOCK) == -1) {
        const ErrorText error(errno);
        trace.error()("Error while setting flag for pipe %d for file %s. errno = %d; %s", m_readFd,
                      fileNameLocal(), error.number(), error.text());
        setMonitorStatus(MONITOR_ERR_SET_PIPE_FLAG);
        return;
    }
    m_lineLength = 0;
    m_readStream = fdopen(m_readFd, "r");
    if (m_readStream == nullptr) {
        const ErrorText error(errno);
        trace.error()("Error converting read pipe fd %d to file pointer for log file %s. "
                      "errno = %d; %s",
                      m_readFd, fileNameLocal(), error.number(), error.text());
        setMonitorStatus(MONITOR_ERR_PIPE_FDOPEN);
    }
}

void ErrLogFile::killChild() {
    TraceScope trace(anchor);
    const pid_t pid = m_childPid;
    trace.detail()("Thread for file %s issuing \"kill -%d\" to kill child process %s ( pid = %d )",
                   fileNameLocal(), SIGTERM, procedure(), static_cast<int>(pid));
    if (kill(pid, SIGTERM) != 0) {
        const ErrorText error(errno);
        trace.error()("Error attempting to terminate command %s ( pid = %d ) for file %s. "
                      "errno = %d; %s",
                      procedure(), static_cast<int>(pid), fileNameLocal(), error.number(),
                      error.text());
        return;
    }
    // Also ends what the shell started. After the wait, the group's number could be reused.
    kill(-pid, SIGTERM);
    int status = 0;
    const pid_t ended = ChildProcess::waitFor(pid, &status);
    if (ended < 0) {
        const ErrorText error(errno);
        trace.error()("Wait system called failed for file %s; pid = %d. errno = %d; %s",
                      fileNameLocal(), static_cast<int>(pid), error.number(), error.text());
    } else if (ended != pid) {
        trace.error()("Unknown child termination detected by %s thread; pid = %d; status = %d",
                      fileNameLocal(), static_cast<int>(ended), status);
    } else if (trace.isOn(TRC1_ERROR) || trace.isOn(TRC1_DETAIL)) {
        printChildStatus(pid, status, procedure());
    }
    m_childPid = 0;
}

void ErrLogFile::printChildStatus(pid_t pid, int status, const char* command) const {
    TraceScope trace(anchor);
    const char* const whose = pid == m_childPid ? "Monitor" : "Report";
    const char* const name = command != nullptr ? command : "";
    const int id = static_cast<int>(pid);
    if (WIFEXITED(status)) {
        trace.detail()("%s command %s ( pid = %d ) for file %s has terminated normally; "
                       "exit status = %d",
                       whose, name, id, fileNameLocal(), WEXITSTATUS(status));
    } else if (WIFSIGNALED(status)) {
        bool hasCore = false;
#ifdef WCOREDUMP
        hasCore = WCOREDUMP(status);
#endif
        trace.error()("%s command %s ( pid = %d ) for file %s has terminated abnormally; "
                      "signal number = %d%s",
                      whose, name, id, fileNameLocal(), WTERMSIG(status),
                      hasCore ? " (core file generated)" : "");
    } else if (WIFSTOPPED(status)) {
        trace.error()("%s command %s ( pid = %d ) for file %s has been stopped by a signal; "
                      "signal number = %d",
                      whose, name, id, fileNameLocal(), WSTOPSIG(status));
    }
}

void ErrLogFile::closePipe(int* fd) {
    TraceScope trace(anchor);
    if (close(*fd) != 0) {
        const ErrorText error(errno);
        trace.error()("Error closing read end of pipe; fd = %d. errno = %d; %s", *fd,
                      error.number(), error.text());
    } else {
        trace.detail()("Read end of pipe closed successfully; fd = %d.", *fd);
    }
    *fd = -1;
}

void ErrLogFile::closePipe(std::FILE** stream) {
    TraceScope trace(anchor);
    if (std::fclose(*stream) != 0) {
        const ErrorText error(errno);
        trace.error()("Error closing read end of pipe. errno = %d; %s", error.number(),
                      error.text());
    } else {
        trace.detail()("Read end of pipe closed successfully.");
    }
    *stream = nullptr;
}

} // namespace zrm
