#include "logtypes/ChildProcess.h"

#include <cerrno>
#include <csignal>
#include <mutex>

#include <fcntl.h>
#include <unistd.h>

namespace {

// Held while a pipe exists without its close-on-exec flags and during a fork. A child that
// inherited another pipe's write end would keep that pipe's reader waiting for as long as it runs.
std::mutex forkLock;

constexpr int standardOutput = 1;

} // namespace

int ChildProcess::openPipe(int fds[2]) {
    const std::lock_guard guard(forkLock);
    if (pipe(fds) != 0) {
        return -1;
    }
    // Fails on no descriptor that is open.
    fcntl(fds[0], F_SETFD, FD_CLOEXEC);
    fcntl(fds[1], F_SETFD, FD_CLOEXEC);
    return 0;
}

pid_t ChildProcess::start() {
    const std::lock_guard guard(forkLock);
    return fork();
}

void ChildProcess::redirectOutput(const int fds[2]) {
    close(fds[0]);
    if (fds[1] == standardOutput) {
        fcntl(standardOutput, F_SETFD, 0);
    } else {
        dup2(fds[1], standardOutput);
        close(fds[1]);
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
