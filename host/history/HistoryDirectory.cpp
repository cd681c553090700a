#include "host/history/HistoryDirectory.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"
#include "host/base/Say.h"
#include "host/base/TimeText.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <charconv>
#include <cinttypes>
#include <cstdio>
#include <ctime>
#include <limits>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"HistoryDirectory.cpp"};

/// SQLite's additional files: the write-ahead log and its index.
constexpr const char* logEnding = "-wal";
constexpr const char* indexEnding = "-shm";

/// Log entries must not be readable by everyone.
constexpr int fileMode = 0640;
constexpr int directoryMode = 0750;

/// What makes it possible to open a history in the directory.
constexpr const char* cure = "make it a directory that the agent may write, or set "
                             "history.directory to one";

/// Opens a file of the history, creating it if missing. Refused when it cannot be opened or is not
/// a regular file. Never blocks, and follows no link.
Result<int> openFile(const std::string& path) {
    const int fd =
        ::open(path.c_str(), O_RDWR | O_CREAT | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK, fileMode);
    if (fd == -1) {
        return errno == ELOOP
                   ? refused(path + " is a symbolic link, which the history does not follow")
                   : refused(because("cannot open " + path, errno));
    }
    struct stat status {};
    if (fstat(fd, &status) != 0 || !S_ISREG(status.st_mode)) {
        close(fd);
        return refused(path + " is not a regular file");
    }
    return fd;
}

/// The same refusal with its cure.
Problem cured(Problem problem) {
    problem.cure = cure;
    return problem;
}

/// Takes the lock; false with errno set.
bool lockWhole(int fd) {
    struct flock whole {};
    whole.l_type = F_WRLCK;
    whole.l_whence = SEEK_SET;
    return fcntl(fd, F_SETLK, &whole) == 0;
}

/// Numbers in the lock file overwrite each other.
constexpr int digitsOfId = 20;

/// The ids that a lock file says are reserved; 0 when it does not.
std::uint64_t idsIn(int lock) {
    std::array<char, digitsOfId> text{};
    const ssize_t length = pread(lock, text.data(), text.size(), 0);
    std::uint64_t last = 0;
    const char* const end = text.data() + std::max<ssize_t>(length, 0);
    const auto [stop, error] = std::from_chars(text.data(), end, last);
    constexpr std::uint64_t mostId = std::numeric_limits<std::int64_t>::max() / 2;
    return length == digitsOfId && error == std::errc() && stop == end && last <= mostId ? last : 0;
}

std::string timeNow() {
    const std::time_t now = WallClock::seconds();
    std::tm utc{};
    gmtime_r(&now, &utc);
    std::array<char, 32> text{};
    std::strftime(text.data(), text.size(), "%Y%m%dT%H%M%SZ", &utc);
    return text.data();
}

} // namespace

HistoryDirectory::HistoryDirectory(const std::string& directory, int lock)
    : m_directory(directory), m_file(directory + "/history.db"), m_lock(lock) {}

HistoryDirectory::~HistoryDirectory() {
    if (m_lock != -1) {
        close(m_lock);
    }
}

Result<std::unique_ptr<HistoryDirectory>> HistoryDirectory::open(const std::string& directory) {
    TraceScope trace(anchor);
    std::unique_ptr<HistoryDirectory> opened(new HistoryDirectory(directory, -1));
    if (const Result<void> restored = opened->restore(); !restored) {
        return tl::unexpected(restored.error());
    }
    return opened;
}

/// Whether the lock file's name still leads to the locked file.
bool HistoryDirectory::hasLock() const {
    struct stat named {};
    struct stat locked {};
    return m_lock != -1 && stat(lockPath().c_str(), &named) == 0 && fstat(m_lock, &locked) == 0 &&
           named.st_dev == locked.st_dev && named.st_ino == locked.st_ino;
}

Result<void> HistoryDirectory::restore() {
    if (mkdir(m_directory.c_str(), directoryMode) == -1 && errno != EEXIST) {
        return refused(because("cannot create the directory " + m_directory, errno), cure);
    }
    if (!hasLock()) {
        if (Result<void> locked = lock(); !locked) {
            return locked;
        }
    }
    return makeFile().map_error(cured);
}

Result<void> HistoryDirectory::lock() {
    const Result<int> opened = openFile(lockPath());
    if (!opened) {
        return tl::unexpected(cured(opened.error()));
    }
    if (!lockWhole(*opened)) {
        const int number = errno;
        close(*opened);
        return number == EACCES || number == EAGAIN
                   ? refused(m_directory + " is in use by another agent",
                             "give each its own history.directory")
                   : refused(because("cannot lock " + lockPath(), number), cure);
    }
    if (m_lock != -1) {
        close(m_lock);
    }
    m_lock = *opened;
    return {};
}

void HistoryDirectory::reserveIds(std::uint64_t last) const {
    TraceScope trace(anchor);
    std::array<char, 24> text{};
    const int length = std::snprintf(text.data(), text.size(), "%0*" PRIu64 "\n", digitsOfId, last);
    if (pwrite(m_lock, text.data(), static_cast<std::size_t>(length), 0) != length) {
        const ErrorText error(errno);
        trace.error()("Error writing %s. errno = %d; %s. Should the history be lost, its ids are "
                      "given again.",
                      lockPath().c_str(), error.number(), error.text());
    }
}

std::uint64_t HistoryDirectory::reservedIds() const {
    return idsIn(m_lock);
}

std::uint64_t HistoryDirectory::reservedIdsIn(const std::string& directory) {
    const int fd =
        ::open(lockPathIn(directory).c_str(), O_RDONLY | O_CLOEXEC | O_NOFOLLOW | O_NONBLOCK);
    if (fd == -1) {
        return 0;
    }
    const std::uint64_t last = idsIn(fd);
    close(fd);
    return last;
}

Result<void> HistoryDirectory::makeFile() const {
    const Result<int> opened = openFile(m_file);
    if (!opened) {
        return tl::unexpected(opened.error());
    }
    struct stat status {};
    if (fstat(*opened, &status) == 0 && status.st_size == 0) {
        // A log and an index beside a new file are those of a lost one. SQLite would use the index
        // as long as another program has it open.
        for (const char* const ending : {logEnding, indexEnding}) {
            unlink((m_file + ending).c_str());
        }
    }
    close(*opened);
    return {};
}

std::uint64_t HistoryDirectory::bytes() const {
    std::uint64_t sum = 0;
    for (const char* const ending : {"", logEnding, indexEnding}) {
        struct stat status {};
        if (stat((m_file + ending).c_str(), &status) == 0) {
            sum += static_cast<std::uint64_t>(status.st_size);
        }
    }
    return sum;
}

Result<void> HistoryDirectory::moveAside(const std::string& why) const {
    TraceScope trace(anchor);
    std::string aside = m_file + ".corrupt-" + timeNow();
    for (int number = 2; access(aside.c_str(), F_OK) == 0; ++number) {
        aside = m_file + ".corrupt-" + timeNow() + '-' + std::to_string(number);
    }
    if (rename(m_file.c_str(), aside.c_str()) != 0) {
        return refused(because("cannot move " + m_file + " aside", errno));
    }
    // The log contains what is not yet in the file; its index is rebuilt from it.
    rename((m_file + logEnding).c_str(), (aside + logEnding).c_str());
    unlink((m_file + indexEnding).c_str());
    say("the history %s is corrupt (%s); it is kept as %s, and a new one begins", m_file.c_str(),
        why.c_str(), aside.c_str());
    return makeFile();
}

} // namespace zrm::host
