#include "host/diagnose/MonitoredLogFile.h"

#include "base/ErrorText.h"

#include <cerrno>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace zrm::host {

namespace {

std::string problemOf(int descriptor, const std::optional<FileIdentity>& monitored) {
    struct stat status;
    if (descriptor == -1 && errno == ELOOP && !monitored) {
        return "the log cannot be read: its name is a symbolic link, and no monitor has its file "
               "open";
    }
    if (descriptor == -1 || ::fstat(descriptor, &status) != 0) {
        const ErrorText error(errno);
        return std::string("the log cannot be read: ") + error.text();
    }
    if (!S_ISREG(status.st_mode)) {
        return "the log cannot be read: it is not a regular file";
    }
    if (monitored && *monitored != FileIdentity{status.st_dev, status.st_ino}) {
        return "the log cannot be read: another file now has its name, and its monitor reads the "
               "one that had the name before";
    }
    return "";
}

} // namespace

MonitoredLogFile::MonitoredLogFile(const std::string& path,
                                   const std::optional<FileIdentity>& monitored)
    : m_descriptor(
          ::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | (monitored ? 0 : O_NOFOLLOW))),
      m_problem(problemOf(m_descriptor, monitored)) {}

MonitoredLogFile::~MonitoredLogFile() {
    if (m_descriptor != -1) {
        ::close(m_descriptor);
    }
}

} // namespace zrm::host
