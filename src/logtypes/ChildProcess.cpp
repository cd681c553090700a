#include "logtypes/ChildProcess.h"

#include <cerrno>
#include <chrono>
#include <csignal>

#include <fcntl.h>
#include <poll.h>
#include <sys/wait.h>
#include <unistd.h>

namespace zrm {

namespace {

/// How long to wait for a child that was asked to end.
constexpr std::chrono::seconds patience{2};
constexpr int lookInterval = 10; // milliseconds

constexpr int standardOutput = 1;
constexpr int firstOther = 3;    // first after the standard descriptors
constexpr int otherLimit = 4096; // more than an agent with a thousand logs has open

} // namespace

int ChildProcess::openPipe(int fds[2]) {
    if (pipe(fds) != 0) {
        return -1;
    }
    // Cannot fail on an open descriptor.
    fcntl(fds[0], F_SETFD, FD_CLOEXEC);
    fcntl(fds[1], F_SETFD, FD_CLOEXEC);
    return 0;
}

pid_t ChildProcess::waitFor(pid_t pid, int* status) {
    using Clock = std::chrono::steady_clock;
    const Clock::time_point limit = Clock::now() + patience;
    for (;;) {
        const pid_t ended = waitpid(pid, status, WNOHANG);
        if (ended > 0 || (ended < 0 && errno != EINTR)) {
            return ended;
        }
        if (ended == 0 && Clock::now() >= limit) {
            kill(-pid, SIGKILL); // its process group, if it leads one
            kill(pid, SIGKILL);
        }
        if (ended == 0) {
            poll(nullptr, 0, lookInterval);
        }
    }
}

void ChildProcess::redirectOutput(const int fds[2]) {
    close(fds[0]);
    if (fds[1] == standardOutput) {
        fcntl(standardOutput, F_SETFD, 0);
    } else {
        dup2(fds[1], standardOutput);
        close(fds[1]);
    }
    // The agent's descriptors close on exec, except between their creation and the call that sets
    // the flag, when another thread may have forked. A command that inherited the write end of
    // another command's pipe would block that pipe's reader. The descriptors stay open until the
    // exec, because the trace needs its own if exec fails.
    for (int fd = firstOther; fd < otherLimit; ++fd) {
        fcntl(fd, F_SETFD, FD_CLOEXEC);
    }
}

void ChildProcess::restoreSignals() {
    struct sigaction action {};
    action.sa_handler = SIG_DFL;
    sigemptyset(&action.sa_mask);
    sigaction(SIGPIPE, &action, nullptr);
    sigaction(SIGTERM, &action, nullptr);
    sigset_t none;
    sigemptyset(&none);
    sigprocmask(SIG_SETMASK, &none, nullptr);
}

ExecErrorTexts::ExecErrorTexts() noexcept
    : m_texts{ErrorText(E2BIG),   ErrorText(EACCES), ErrorText(EAGAIN),       ErrorText(EINVAL),
              ErrorText(EIO),     ErrorText(ELOOP),  ErrorText(ENAMETOOLONG), ErrorText(ENOENT),
              ErrorText(ENOEXEC), ErrorText(ENOMEM), ErrorText(ENOTDIR),      ErrorText(EPERM)} {}

const char* ExecErrorTexts::text(int number) const noexcept {
    for (const ErrorText& candidate : m_texts) {
        if (candidate.number() == number) {
            return candidate.text();
        }
    }
    return "Unknown error";
}

} // namespace zrm
