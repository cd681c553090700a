#include "host/framework/TraceOutput.h"

#include "host/base/ForkedChild.h"
#include "host/base/PatientWrite.h"

#include <atomic>
#include <cerrno>
#include <memory>
#include <mutex>
#include <string>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace zrm::host {

namespace {

/// A file that was opened. Never destroyed, since a thread may be writing to it; the chain keeps
/// track of the earlier ones.
struct TraceFile {
    std::string path;
    int fd;
    const TraceFile* earlier;
};

// Constant-initialised and without destructors: threads trace until the process is gone.
constinit std::mutex g_mutex; ///< serialises open()
std::atomic<const TraceFile*> g_file{nullptr};
const TraceFile* g_opened = nullptr; ///< the latest file, also when standard error is used again
std::atomic<std::time_t> g_lastCheck{0};

int openToAppend(const char* path) noexcept {
    constexpr int flags =
        O_WRONLY | O_APPEND | O_CREAT | O_NONBLOCK | O_CLOEXEC | O_NOCTTY | O_NOFOLLOW;
    return ::open(path, flags, 0640);
}

/// Puts `fd` in the place of `target`, which writers go on using, and returns `target`.
int replace(int target, int fd) noexcept {
    dup3(fd, target, O_CLOEXEC);
    close(fd);
    return target;
}

bool wasMovedAway(const TraceFile& file) noexcept {
    struct stat named {};
    struct stat opened {};
    if (stat(file.path.c_str(), &named) != 0) {
        return errno == ENOENT;
    }
    return fstat(file.fd, &opened) == 0 &&
           (named.st_ino != opened.st_ino || named.st_dev != opened.st_dev);
}

/// Looks once a second; of the threads that trace in it, one does.
void reopenWhenMovedAway(const TraceFile& file, std::time_t now) noexcept {
    std::time_t last = g_lastCheck.load(std::memory_order_relaxed);
    if (last == now || ForkedChild::isCaller() ||
        !g_lastCheck.compare_exchange_strong(last, now, std::memory_order_relaxed) ||
        !wasMovedAway(file)) {
        return;
    }
    const int fd = openToAppend(file.path.c_str());
    if (fd >= 0) {
        replace(file.fd, fd);
    }
}

} // namespace

int TraceOutput::open(const char* path) {
    const std::lock_guard guard(g_mutex);
    if (*path == '\0') {
        g_file.store(nullptr, std::memory_order_release);
        return 0;
    }
    auto file = std::make_unique<TraceFile>(TraceFile{path, -1, g_opened});
    const int fd = openToAppend(path);
    if (fd < 0) {
        return errno;
    }
    file->fd = g_opened != nullptr ? replace(g_opened->fd, fd) : fd;
    g_opened = file.release();
    g_file.store(g_opened, std::memory_order_release);
    return 0;
}

void TraceOutput::write(std::string_view record, std::time_t now) noexcept {
    const TraceFile* const file = g_file.load(std::memory_order_acquire);
    if (file != nullptr) {
        reopenWhenMovedAway(*file, now);
    }
    if (file != nullptr) {
        PatientWrite::toFile(file->fd, record);
    } else {
        PatientWrite::toStandardError(record);
    }
}

} // namespace zrm::host
