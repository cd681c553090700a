#include "host/sinks/JsonlSink.h"

#include "base/TraceScope.h"
#include "host/base/Result.h"

#include <algorithm>
#include <cerrno>

#include <fcntl.h>
#include <limits.h>
#include <poll.h>
#include <sys/stat.h>
#include <unistd.h>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"JsonlSink.cpp"};

constexpr std::chrono::seconds lookInterval{1};
constexpr int pollSlice = 100; ///< milliseconds

/// Reopens standard output, if it is a pipe or a terminal, as a file of the sink's own, so that no
/// write blocks: other processes that share it may fill the room found a moment before, and a
/// terminal may have room for less than is written. If that is not possible, if it is not writable,
/// or if it is a file on disk, whose position is shared with others, uses standard output itself.
int openStandardOutput() {
    struct stat status {};
    const int flags = fcntl(STDOUT_FILENO, F_GETFL);
    if (fstat(STDOUT_FILENO, &status) != 0 || flags == -1 || (flags & O_ACCMODE) == O_RDONLY ||
        !(S_ISFIFO(status.st_mode) || S_ISCHR(status.st_mode))) {
        return STDOUT_FILENO;
    }
    const int fd = ::open("/proc/self/fd/1", O_WRONLY | O_CLOEXEC | O_NOCTTY | O_NONBLOCK);
    return fd == -1 ? STDOUT_FILENO : fd;
}

} // namespace

JsonlSink::JsonlSink(const SinkConfig& config)
    : m_name(config.name), m_path(config.text("path")), m_isStandardOutput(m_path == "-") {}

JsonlSink::~JsonlSink() {
    close();
}

void JsonlSink::fail(const char* call, int number) {
    m_error = because(std::string(call) + " failed", number);
}

bool JsonlSink::open() {
    TraceScope trace(anchor);
    // Non-blocking: a named pipe without a reader must not block the thread.
    constexpr int flags = O_WRONLY | O_APPEND | O_CREAT | O_CLOEXEC | O_NONBLOCK | O_NOFOLLOW;
    m_fd = m_isStandardOutput ? openStandardOutput() : ::open(m_path.c_str(), flags, 0640);
    if (m_fd == -1 && errno == ELOOP) {
        m_error = m_path + " is a symbolic link, which is not followed; name the file itself";
        return trace.result(false);
    }
    if (m_fd == -1 && errno == ENXIO) {
        m_error = "no process reads " + m_path + "; start its reader";
        return trace.result(false);
    }
    if (m_fd == -1) {
        fail("open", errno);
        return trace.result(false);
    }
    struct stat status {};
    m_isRegular = fstat(m_fd, &status) == 0 && S_ISREG(status.st_mode);
    const bool isAppended = (fcntl(m_fd, F_GETFL) & O_APPEND) != 0; // standard output may not be
    const long pipeBuffer = fpathconf(m_fd, _PC_PIPE_BUF);
    m_unblockedWrite = pipeBuffer > 0 ? static_cast<std::size_t>(pipeBuffer) : _POSIX_PIPE_BUF;
    m_lookAgain = Clock::now() + lookInterval;
    if (m_isRegular && isAppended && status.st_size > 0 && !endLastLine()) {
        close();
        return trace.result(false);
    }
    trace.detail()("Sink %s opened.", m_path.c_str());
    return trace.result(true);
}

/// An agent killed while writing may have left an incomplete line: ends it, so that the next line
/// is separate. False on failure.
bool JsonlSink::endLastLine() {
    constexpr int flags = O_RDONLY | O_CLOEXEC | O_NONBLOCK;
    char last = '\n';
    const int fd = m_isStandardOutput ? ::open("/proc/self/fd/1", flags)
                                      : ::open(m_path.c_str(), flags | O_NOFOLLOW);
    if (fd != -1) { // a file that this user may write but not read is used as it is
        if (lseek(fd, -1, SEEK_END) == -1 || ::read(fd, &last, 1) != 1) {
            last = '\n';
        }
        ::close(fd);
    }
    if (last != '\n' && ::write(m_fd, "\n", 1) != 1) {
        fail("write", errno);
        return false;
    }
    return true;
}

void JsonlSink::close() {
    if (m_fd != -1 && m_fd != STDOUT_FILENO) {
        ::close(m_fd);
    }
    m_fd = -1;
}

bool JsonlSink::movedAway() {
    if (m_isStandardOutput || Clock::now() < m_lookAgain) {
        return false;
    }
    m_lookAgain = Clock::now() + lookInterval;
    struct stat opened {};
    struct stat named {};
    return fstat(m_fd, &opened) != 0 || lstat(m_path.c_str(), &named) != 0 ||
           opened.st_dev != named.st_dev || opened.st_ino != named.st_ino;
}

bool JsonlSink::ready() {
    // A torn line is completed where it began.
    if (m_fd != -1 && m_torn == 0 && movedAway()) {
        close();
    }
    return m_fd != -1 || open();
}

bool JsonlSink::waitWritable(const std::stop_token& giveUp) {
    const Clock::time_point begin = Clock::now();
    bool isReady = false;
    while (!isReady && !giveUp.stop_requested()) {
        struct pollfd descriptor = {m_fd, POLLOUT, 0};
        const int ready = poll(&descriptor, 1, pollSlice);
        // Whatever else poll reports, the write itself fails with the right errno.
        isReady = ready > 0 || (ready == -1 && errno != EINTR);
        if (!isReady && m_waitsSince == 0) {
            m_waitsSince = begin.time_since_epoch().count();
        }
    }
    m_waitsSince = 0;
    if (!isReady) {
        m_error = "the reader does not read";
    }
    return isReady;
}

std::optional<std::chrono::steady_clock::time_point> JsonlSink::waitsSince() const {
    const Clock::rep since = m_waitsSince;
    return since == 0 ? std::nullopt : std::optional(Clock::time_point(Clock::duration(since)));
}

std::size_t JsonlSink::write(std::string_view text, const std::stop_token& giveUp) {
    std::size_t done = 0;
    while (done < text.size()) {
        std::size_t most = text.size() - done;
        if (!m_isRegular) {
            if (!waitWritable(giveUp)) {
                return done;
            }
            most = std::min(most, m_unblockedWrite);
        }
        const ssize_t written = ::write(m_fd, text.data() + done, most);
        if (written > 0) {
            done += static_cast<std::size_t>(written);
        } else if (written == 0 || (errno != EINTR && errno != EAGAIN)) {
            fail("write", written == 0 ? ENOSPC : errno);
            return done;
        }
    }
    return done;
}

void JsonlSink::takeBackTornLine() {
    if (m_torn == 0 || m_isStandardOutput || !m_isRegular) {
        return;
    }
    // Nobody else has written if the file ends where this sink's last write ended.
    const off_t end = lseek(m_fd, 0, SEEK_CUR);
    struct stat status {};
    if (end != -1 && fstat(m_fd, &status) == 0 && status.st_size == end &&
        ftruncate(m_fd, end - static_cast<off_t>(m_torn)) == 0) {
        m_torn = 0;
    }
}

std::size_t JsonlSink::deliver(std::span<const EventRecord> events, const std::stop_token& giveUp) {
    TraceScope trace(anchor);
    m_text.clear();
    m_lines.clear();
    for (const EventRecord& event : events) {
        m_text += event.json;
        m_text += '\n';
        m_lines.push_back(m_text.size());
    }
    if (!ready()) {
        return trace.result(std::size_t{0});
    }
    const std::size_t written = m_torn + write(std::string_view(m_text).substr(m_torn), giveUp);
    const auto whole = std::upper_bound(m_lines.begin(), m_lines.end(), written);
    const auto delivered = static_cast<std::size_t>(whole - m_lines.begin());
    m_torn = written - (delivered == 0 ? 0 : m_lines[delivered - 1]);
    if (delivered < events.size()) {
        takeBackTornLine();
        if (m_torn == 0) {
            close(); // the next try checks the path again
        }
    }
    return trace.result(delivered);
}

} // namespace zrm::host
