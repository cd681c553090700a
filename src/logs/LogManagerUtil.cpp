#include "logs/LogManagerUtil.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"

#include <cctype>
#include <cerrno>
#include <cstdio>
#include <cstring>
#include <new>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace zrm {

namespace {

TRC1_Anchor anchor{"LogManagerUtil.cpp"};

/// The configuration file being read. Trivially destructible, because the process may end while the
/// manager thread is reading.
struct Reader {
    std::FILE* stream;
    char* line;

    bool isOpen() const { return stream != nullptr; }
    bool open(const TraceScope& trace, const char* path);
    void close();
};

Reader reader{};

bool Reader::open(const TraceScope& trace, const char* path) {
    stream = LogManagerUtil::openStream(path, "r");
    if (stream == nullptr) {
        trace.error()("Error opening file %s; errno = %d", path, errno);
        return false;
    }
    line = new (std::nothrow) char[LogManagerUtil::recordSize];
    if (line == nullptr) {
        trace.error()("Memory allocation for %d bytes failed; errno = %d",
                      LogManagerUtil::recordSize, errno);
        close();
        return false;
    }
    return true;
}

void Reader::close() {
    std::fclose(stream);
    stream = nullptr;
    delete[] line;
    line = nullptr;
}

} // namespace

std::FILE* LogManagerUtil::openStream(const char* path, const char* mode) {
    const bool appending = mode[0] == 'a';
    // Files that the agent writes contain log lines, and the configuration chooses their location.
    // So others get no permissions, and a symbolic link in place of the file is not followed.
    const int flags = appending ? O_WRONLY | O_CREAT | O_APPEND | O_NOFOLLOW : O_RDONLY;
    // Neither the open nor a write may block on the other end of a pipe.
    const int fd = ::open(path, flags | O_NONBLOCK | O_CLOEXEC, 0640);
    if (fd == -1) {
        return nullptr;
    }
    std::FILE* const stream = ::fdopen(fd, mode);
    if (stream == nullptr) {
        const int error = errno;
        ::close(fd);
        errno = error;
    }
    return stream;
}

std::time_t LogManagerUtil::fileLastModified(const char* path) {
    TraceScope trace(anchor);
    struct stat status;
    if (::stat(path, &status) != 0) {
        const ErrorText error(errno);
        trace.error()("stat() command failed for %s errno = %d; %s.", path, error.number(),
                      error.text());
        return trace.result(std::time_t{0});
    }
    if (!S_ISREG(status.st_mode)) {
        trace.error()("The file %s is not a regular file.", path);
        return trace.result(std::time_t{0});
    }
    return trace.result(status.st_mtime);
}

char* LogManagerUtil::nextRecord(std::FILE* stream, char* line) {
    bool tooLong = false;
    while (std::fgets(line, recordSize, stream) != nullptr) {
        if (line[0] == '#') {
            continue;
        }
        const std::size_t length = std::strlen(line);
        if (length == 0 || line[length - 1] != '\n') {
            tooLong = true;
            continue;
        }
        line[length - 1] = '\0';
        if (tooLong) {
            tooLong = false;
            continue;
        }
        char* text = line;
        while (std::isspace(static_cast<unsigned char>(*text)) != 0) {
            ++text;
        }
        if (*text != '\0') {
            return text;
        }
    }
    return nullptr;
}

char* LogManagerUtil::getNextRec(const char* path) {
    TraceScope trace(anchor);
    if (!reader.isOpen() && !reader.open(trace, path)) {
        return trace.result<char*>(nullptr);
    }
    char* const record = nextRecord(reader.stream, reader.line);
    if (record != nullptr) {
        return trace.result(record);
    }
    if (std::ferror(reader.stream) != 0) {
        const ErrorText error(errno);
        trace.error()("Error while reading %s; errno = %d: %s", path, error.number(), error.text());
    }
    reader.close();
    return trace.result<char*>(nullptr);
}

char* LogManagerUtil::xtoa(char* out, const void* /*data*/, std::size_t /*length*/) {
    TraceScope trace(anchor);
    // Every digit would be written to the first character, which the terminator then overwrites.
    // So the bytes are not read at all.
    *out = '\0';
    return trace.result(out);
}

} // namespace zrm
