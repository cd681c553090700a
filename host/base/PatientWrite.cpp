#include "host/base/PatientWrite.h"

#include "host/base/ForkedChild.h"

#include <atomic>
#include <cerrno>
#include <cstdint>
#include <cstdio>

#include <poll.h>
#include <sched.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/types.h>
#include <unistd.h>

namespace zrm::host {

namespace {

constexpr int patience = 1000; // milliseconds
constexpr std::size_t pipeRoom = 4096;
constexpr std::size_t terminalRoom = 256;

/// Whether the reader has been found not to read, and how much it has lost since. Shared by both
/// outputs, since a process uses only one at a time.
std::atomic<bool> isStuck{false};
std::atomic<std::uint64_t> lost{0};
std::atomic_flag isWriting; ///< held briefly for a check and a write

enum class Kind { WAITING, PIPE, TERMINAL, SOCKET };

/// How standard error can be written without blocking. It may be replaced while the process runs,
/// so it is checked each time, which costs little compared to the write.
Kind kindOf(int fd) noexcept {
    struct stat status {};
    if (fstat(fd, &status) != 0) {
        return Kind::WAITING;
    }
    return S_ISSOCK(status.st_mode)   ? Kind::SOCKET
           : S_ISFIFO(status.st_mode) ? Kind::PIPE
           : S_ISCHR(status.st_mode)  ? Kind::TERMINAL
                                      : Kind::WAITING;
}

bool isWritable(int fd, int limit) noexcept {
    pollfd entry{fd, POLLOUT, 0};
    return poll(&entry, 1, limit) > 0;
}

/// Writes what a writable pipe or terminal takes without blocking, as long as nobody else writes
/// between the check and the write; other threads of this process do not.
ssize_t writeAtOnce(int fd, std::string_view part) noexcept {
    const bool isAlone = ForkedChild::isCaller(); // the parent's other threads do not exist here
    while (!isAlone && isWriting.test_and_set(std::memory_order_acquire)) {
        sched_yield();
    }
    ssize_t written = -1;
    if (isWritable(fd, 0)) {
        written = write(fd, part.data(), part.size());
    } else {
        errno = EAGAIN;
    }
    if (!isAlone) {
        isWriting.clear(std::memory_order_release);
    }
    return written;
}

/// One attempt; -1 with EAGAIN when the reader takes nothing now.
ssize_t attempt(int fd, Kind kind, std::string_view part) noexcept {
    if (kind == Kind::SOCKET) {
        return send(fd, part.data(), part.size(), MSG_DONTWAIT | MSG_NOSIGNAL);
    }
    if (kind == Kind::PIPE) {
        return writeAtOnce(fd, part.substr(0, pipeRoom));
    }
    if (kind == Kind::TERMINAL) {
        return writeAtOnce(fd, part.substr(0, terminalRoom));
    }
    return write(fd, part.data(), part.size());
}

bool writeAll(int fd, Kind kind, std::string_view record) noexcept {
    while (!record.empty()) {
        const ssize_t written = attempt(fd, kind, record);
        if (written >= 0) {
            record.remove_prefix(static_cast<std::size_t>(written));
        } else if (errno == EAGAIN || errno == EWOULDBLOCK) {
            if (!isWritable(fd, isStuck.load(std::memory_order_relaxed) ? 0 : patience)) {
                isStuck.store(true, std::memory_order_relaxed);
                return false;
            }
        } else if (errno != EINTR) {
            return true; // there is nobody left to report it to
        }
    }
    return true;
}

void writeRecord(int fd, Kind kind, std::string_view record) noexcept {
    if (isStuck.load(std::memory_order_relaxed)) {
        if (!isWritable(fd, 0)) {
            lost.fetch_add(1, std::memory_order_relaxed);
            return;
        }
        if (isStuck.exchange(false, std::memory_order_relaxed)) {
            char line[96];
            const int length = std::snprintf(
                line, sizeof line, "zrmagent: %llu lines were lost here because nobody read them\n",
                static_cast<unsigned long long>(lost.exchange(0, std::memory_order_relaxed)));
            writeAll(fd, kind, {line, static_cast<std::size_t>(length)});
        }
    }
    if (!writeAll(fd, kind, record)) {
        lost.fetch_add(1, std::memory_order_relaxed);
    }
}

} // namespace

void PatientWrite::toStandardError(std::string_view record) noexcept {
    writeRecord(STDERR_FILENO, kindOf(STDERR_FILENO), record);
}

void PatientWrite::toFile(int fd, std::string_view record) noexcept {
    writeRecord(fd, Kind::WAITING, record);
}

} // namespace zrm::host
