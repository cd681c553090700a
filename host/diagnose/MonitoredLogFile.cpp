#include "host/diagnose/MonitoredLogFile.h"

#include <cerrno>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace zrm::host {

Result<MonitoredLogFile> MonitoredLogFile::open(const std::string& path,
                                                const std::optional<FileIdentity>& monitored) {
    constexpr const char* what = "the log cannot be read";
    const auto refusedSince = [](const char* why) {
        return refused(std::string(what) + ": " + why);
    };
    const int descriptor =
        ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | (monitored ? 0 : O_NOFOLLOW));
    if (descriptor == -1 && errno == ELOOP && !monitored) {
        return refusedSince("its name is a symbolic link, and no monitor has its file open");
    }
    if (descriptor == -1) {
        return refused(because(what, errno));
    }
    MonitoredLogFile file(descriptor);
    struct stat status;
    if (::fstat(descriptor, &status) != 0) {
        return refused(because(what, errno));
    }
    if (!S_ISREG(status.st_mode)) {
        return refusedSince("it is not a regular file");
    }
    if (monitored && *monitored != FileIdentity{status.st_dev, status.st_ino}) {
        return refusedSince("another file now has its name, and its monitor reads the one that had "
                            "the name before");
    }
    return file;
}

MonitoredLogFile::~MonitoredLogFile() {
    if (m_descriptor != -1) {
        ::close(m_descriptor);
    }
}

} // namespace zrm::host
