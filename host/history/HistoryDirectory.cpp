#include "host/history/HistoryDirectory.h"

#include "agent/ErrorText.h"
#include "agent/TraceScope.h"
#include "host/start/Say.h"

#include <array>
#include <cerrno>
#include <cstdio>
#include <ctime>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace {

TRC1_Anchor anchor{"HistoryDirectory.cpp"};

/// What SQLite keeps beside its file: the write-ahead log and the index of it.
constexpr const char* logEnding = "-wal";
constexpr const char* indexEnding = "-shm";

/// Log entries are not for everybody's eyes.
constexpr int fileMode = 0640;
constexpr int directoryMode = 0750;

std::string because(const std::string& what, int number) {
    const ErrorText error(number);
    return what + ": " + error.text();
}

/// Takes the lock; false leaves errno.
bool lockWhole(int fd) {
    struct flock whole {};
    whole.l_type = F_WRLCK;
    whole.l_whence = SEEK_SET;
    return fcntl(fd, F_SETLK, &whole) == 0;
}

std::string timeNow() {
    const std::time_t now = std::time(nullptr);
    std::tm utc{};
    gmtime_r(&now, &utc);
    std::array<char, 32> text{};
    std::strftime(text.data(), text.size(), "%Y%m%dT%H%M%SZ", &utc);
    return text.data();
}

} // namespace

HistoryDirectory::HistoryDirectory(const std::string& directory, int lock)
    : m_file(directory + "/history.db"), m_lock(lock) {}

HistoryDirectory::~HistoryDirectory() {
    close(m_lock);
}

std::variant<std::unique_ptr<HistoryDirectory>, std::string>
HistoryDirectory::open(const std::string& directory) {
    TraceScope trace(anchor);
    constexpr const char* cure = "; make it a directory that the agent may write, or set "
                                 "history.directory to one";
    if (mkdir(directory.c_str(), directoryMode) == -1 && errno != EEXIST) {
        return because("cannot make the directory " + directory, errno) + cure;
    }
    const std::string lock = directory + "/history.lock";
    const int fd = ::open(lock.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, fileMode);
    if (fd == -1) {
        return because("cannot open " + lock, errno) + cure;
    }
    std::unique_ptr<HistoryDirectory> opened(new HistoryDirectory(directory, fd));
    if (!lockWhole(fd)) {
        if (errno == EACCES || errno == EAGAIN) {
            return directory + " is in use by another agent; give each its own history.directory";
        }
        return because("cannot lock " + lock, errno) + cure;
    }
    if (std::string problem = opened->makeFile(); !problem.empty()) {
        return problem + cure;
    }
    return opened;
}

std::string HistoryDirectory::makeFile() const {
    const int fd = ::open(m_file.c_str(), O_RDWR | O_CREAT | O_CLOEXEC, fileMode);
    if (fd == -1) {
        return because("cannot open " + m_file, errno);
    }
    close(fd);
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

std::string HistoryDirectory::moveAside(const std::string& why) const {
    TraceScope trace(anchor);
    std::string aside = m_file + ".corrupt-" + timeNow();
    for (int number = 2; access(aside.c_str(), F_OK) == 0; ++number) {
        aside = m_file + ".corrupt-" + timeNow() + '-' + std::to_string(number);
    }
    if (rename(m_file.c_str(), aside.c_str()) != 0) {
        return because("cannot move " + m_file + " aside", errno);
    }
    // The log holds what the file does not have yet; the index is made anew from it.
    rename((m_file + logEnding).c_str(), (aside + logEnding).c_str());
    unlink((m_file + indexEnding).c_str());
    say("the history %s is corrupt (%s); it is kept as %s, and a new one begins", m_file.c_str(),
        why.c_str(), aside.c_str());
    return makeFile();
}
