#include "monitor/ReadGuard.h"

#include <algorithm>
#include <cstring>
#include <memory>
#include <string_view>

#include <dirent.h>
#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace zrm {

namespace {

constexpr int mostCopies = 100; ///< files to check; a directory may hold any number

class Descriptor {
public:
    explicit Descriptor(int fd) noexcept : m_fd(fd) {}
    ~Descriptor() {
        if (m_fd >= 0) {
            close(m_fd);
        }
    }
    Descriptor(const Descriptor&) = delete;
    Descriptor& operator=(const Descriptor&) = delete;
    int get() const noexcept { return m_fd; }

private:
    int m_fd;
};

} // namespace

void ReadGuard::take(int fd, std::int64_t end) noexcept {
    const auto wanted =
        static_cast<std::size_t>(std::clamp<std::int64_t>(end, 0, static_cast<std::int64_t>(size)));
    m_from = end - static_cast<std::int64_t>(wanted);
    const bool isRead =
        wanted > 0 && pread(fd, m_bytes.data(), wanted, m_from) == static_cast<ssize_t>(wanted);
    m_length = isRead ? wanted : 0;
}

bool ReadGuard::holds(int fd) const noexcept {
    return m_length == 0 || isAt(fd);
}

bool ReadGuard::isAt(int fd) const noexcept {
    Bytes found;
    return pread(fd, found.data(), m_length, m_from) == static_cast<ssize_t>(m_length) &&
           std::memcmp(found.data(), m_bytes.data(), m_length) == 0;
}

std::int64_t ReadGuard::unreadInCopy(int fd, const char* path) const noexcept {
    const std::string_view whole = path;
    const std::size_t slash = whole.rfind('/');
    struct stat log;
    if (m_length == 0 || slash == std::string_view::npos || fstat(fd, &log) != 0) {
        return -1;
    }
    const std::string_view name = whole.substr(slash + 1);
    char directory[4096];
    if (slash + 2 > sizeof directory) {
        return -1;
    }
    std::memcpy(directory, path, slash + 1);
    directory[slash + 1] = '\0';
    const std::unique_ptr<DIR, int (*)(DIR*)> entries(opendir(directory), closedir);
    if (!entries) {
        return -1;
    }
    const std::int64_t end = m_from + static_cast<std::int64_t>(m_length);
    std::int64_t unread = -1;
    timespec newest{};
    int looked = 0;
    // Only this call uses the stream. NOLINTNEXTLINE(concurrency-mt-unsafe)
    while (const dirent* const entry = looked < mostCopies ? readdir(entries.get()) : nullptr) {
        const std::string_view other = entry->d_name;
        if (other.size() <= name.size() || !other.starts_with(name)) {
            continue;
        }
        ++looked;
        const Descriptor copy(openat(dirfd(entries.get()), entry->d_name,
                                     O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOFOLLOW));
        struct stat status;
        if (copy.get() < 0 || fstat(copy.get(), &status) != 0 || !S_ISREG(status.st_mode) ||
            (status.st_dev == log.st_dev && status.st_ino == log.st_ino) || status.st_size < end ||
            !isAt(copy.get())) {
            continue;
        }
        const timespec& changed = status.st_mtim;
        if (unread < 0 || changed.tv_sec > newest.tv_sec ||
            (changed.tv_sec == newest.tv_sec && changed.tv_nsec > newest.tv_nsec)) {
            unread = status.st_size - end;
            newest = changed;
        }
    }
    return unread;
}

} // namespace zrm
