#include "host/sources/CommandChild.h"

#include "base/ErrorText.h"

#include <algorithm>
#include <cerrno>
#include <csignal>
#include <cstring>
#include <utility>

#include <fcntl.h>
#include <poll.h>
#include <spawn.h>
#include <sys/wait.h>
#include <unistd.h>

extern char** environ;

namespace zrm::host {

namespace {

using Clock = std::chrono::steady_clock;

constexpr std::chrono::milliseconds patience{500}; ///< for a process that is to end
constexpr int lookInterval = 5;                    ///< milliseconds
constexpr int firstOther = 3;                      ///< after the standard descriptors

/// The attributes of a process to start: its own group, and the signals as at a login.
class SpawnAttributes {
public:
    SpawnAttributes() {
        posix_spawnattr_init(&m_attributes);
        sigset_t none;
        sigset_t all;
        sigemptyset(&none);
        sigfillset(&all);
        posix_spawnattr_setsigmask(&m_attributes, &none);
        posix_spawnattr_setsigdefault(&m_attributes, &all);
        posix_spawnattr_setpgroup(&m_attributes, 0);
        posix_spawnattr_setflags(&m_attributes, POSIX_SPAWN_SETSIGMASK | POSIX_SPAWN_SETSIGDEF |
                                                    POSIX_SPAWN_SETPGROUP);
    }
    ~SpawnAttributes() { posix_spawnattr_destroy(&m_attributes); }
    SpawnAttributes(const SpawnAttributes&) = delete;
    SpawnAttributes& operator=(const SpawnAttributes&) = delete;
    const posix_spawnattr_t* get() const noexcept { return &m_attributes; }

private:
    posix_spawnattr_t m_attributes;
};

/// The descriptors of a process to start: no input, both outputs in pipes, and no others.
class SpawnDescriptors {
public:
    SpawnDescriptors(int output, int errors) {
        posix_spawn_file_actions_init(&m_actions);
        posix_spawn_file_actions_addopen(&m_actions, STDIN_FILENO, "/dev/null", O_RDONLY, 0);
        posix_spawn_file_actions_adddup2(&m_actions, output, STDOUT_FILENO);
        posix_spawn_file_actions_adddup2(&m_actions, errors, STDERR_FILENO);
        posix_spawn_file_actions_addclosefrom_np(&m_actions, firstOther);
    }
    ~SpawnDescriptors() { posix_spawn_file_actions_destroy(&m_actions); }
    SpawnDescriptors(const SpawnDescriptors&) = delete;
    SpawnDescriptors& operator=(const SpawnDescriptors&) = delete;
    const posix_spawn_file_actions_t* get() const noexcept { return &m_actions; }

private:
    posix_spawn_file_actions_t m_actions;
};

/// A pipe whose ends are above the standard descriptors, so that none of these is overwritten
/// before it is used.
class Pipe {
public:
    Pipe() {
        int ends[2];
        if (pipe2(ends, O_CLOEXEC) != 0) {
            return;
        }
        for (int index = 0; index < 2; ++index) {
            m_ends[index] = ends[index];
            if (ends[index] < firstOther) {
                m_ends[index] = fcntl(ends[index], F_DUPFD_CLOEXEC, firstOther);
                ::close(ends[index]);
            }
        }
    }
    ~Pipe() {
        for (const int end : m_ends) {
            if (end >= 0) {
                ::close(end);
            }
        }
    }
    Pipe(const Pipe&) = delete;
    Pipe& operator=(const Pipe&) = delete;

    bool isOpen() const noexcept { return m_ends[0] >= 0 && m_ends[1] >= 0; }
    int writeEnd() const noexcept { return m_ends[1]; }
    /// The read end, which does not block, for the caller to close.
    int takeReadEnd() noexcept {
        fcntl(m_ends[0], F_SETFL, O_NONBLOCK);
        return std::exchange(m_ends[0], -1);
    }

private:
    int m_ends[2] = {-1, -1};
};

/// How a process ended, as a clause.
std::string textOf(const siginfo_t& info) {
    if (info.si_code == CLD_EXITED) {
        return "the command ended with status " + std::to_string(info.si_status);
    }
    const char* const name = sigabbrev_np(info.si_status);
    return "the command was ended by " + (name != nullptr
                                              ? "SIG" + std::string(name)
                                              : "signal " + std::to_string(info.si_status));
}

} // namespace

CommandChild::~CommandChild() {
    if (isRunning()) {
        end();
    }
}

int CommandChild::start(const std::vector<std::string>& arguments) {
    m_errorLine.clear();
    m_lastError.clear();
    Pipe output;
    Pipe errors;
    if (!output.isOpen() || !errors.isOpen()) {
        return errno;
    }
    std::vector<char*> argv;
    for (const std::string& argument : arguments) {
        argv.push_back(const_cast<char*>(argument.c_str()));
    }
    argv.push_back(nullptr);
    const SpawnAttributes attributes;
    const SpawnDescriptors descriptors(output.writeEnd(), errors.writeEnd());
    pid_t pid = -1;
    const int outcome =
        posix_spawnp(&pid, argv.front(), descriptors.get(), attributes.get(), argv.data(), environ);
    if (outcome != 0) {
        return outcome;
    }
    m_pid = pid;
    m_output = output.takeReadEnd();
    m_errors = errors.takeReadEnd();
    return 0;
}

ssize_t CommandChild::read(char* out, std::size_t size) noexcept {
    ssize_t count = -1;
    do {
        count = ::read(m_output, out, size);
    } while (count < 0 && errno == EINTR);
    return count;
}

void CommandChild::readErrors() {
    char block[4096];
    // No more than a pipe holds, so that who floods it holds up nobody.
    for (int blocks = 0; m_errors >= 0 && blocks < 16; ++blocks) {
        const ssize_t count = ::read(m_errors, block, sizeof block);
        if (count > 0) {
            takeErrors({block, static_cast<std::size_t>(count)});
        } else if (count == 0) {
            ::close(std::exchange(m_errors, -1));
        } else if (errno != EINTR) {
            break;
        }
    }
}

void CommandChild::takeErrors(std::string_view text) {
    for (const char character : text) {
        if (character != '\n') {
            if (m_errorLine.size() < longestError) {
                m_errorLine += static_cast<unsigned char>(character) < ' ' ? ' ' : character;
            }
        } else {
            if (m_errorLine.find_first_not_of(' ') != m_errorLine.npos) {
                m_lastError = m_errorLine;
            }
            m_errorLine.clear();
        }
    }
}

void CommandChild::wait(std::chrono::milliseconds most) const noexcept {
    pollfd ends[] = {{m_output, POLLIN, 0}, {m_errors, POLLIN, 0}};
    poll(ends, 2, static_cast<int>(most.count()));
}

bool CommandChild::hasEnded() const noexcept {
    siginfo_t info{};
    // It stays a zombie, so that its number remains that of the group.
    return isRunning() &&
           waitid(P_PID, static_cast<id_t>(m_pid), &info, WEXITED | WNOHANG | WNOWAIT) == 0 &&
           info.si_pid == m_pid;
}

bool CommandChild::waitForEnd() const noexcept {
    const Clock::time_point limit = Clock::now() + patience;
    while (!hasEnded() && Clock::now() < limit) {
        poll(nullptr, 0, lookInterval);
    }
    return hasEnded();
}

std::string CommandChild::end() {
    kill(-m_pid, SIGTERM);
    waitForEnd();
    readErrors();
    takeErrors("\n");
    kill(-m_pid, SIGKILL);
    siginfo_t info{};
    while (waitid(P_PID, static_cast<id_t>(m_pid), &info, WEXITED) != 0 && errno == EINTR) {
    }
    m_pid = -1;
    closePipes();
    return textOf(info);
}

void CommandChild::closePipes() noexcept {
    for (int* const end : {&m_output, &m_errors}) {
        if (*end >= 0) {
            ::close(std::exchange(*end, -1));
        }
    }
}

} // namespace zrm::host
