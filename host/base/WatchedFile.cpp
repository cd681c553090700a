#include "host/base/WatchedFile.h"

#include <utility>

#include <sys/stat.h>

namespace zrm::host {

WatchedFile::WatchedFile(std::string path)
    : m_path(std::move(path)), m_known(look()), m_seen(m_known) {}

std::optional<WatchedFile::Version> WatchedFile::look() const {
    struct stat status {};
    if (m_path.empty() || stat(m_path.c_str(), &status) != 0) {
        return std::nullopt;
    }
    return Version{status.st_dev, status.st_ino, status.st_size, status.st_mtim.tv_sec,
                   status.st_mtim.tv_nsec};
}

bool WatchedFile::hasChanged() {
    const std::optional<Version> now = look();
    const bool isStill = now == m_seen;
    m_seen = now;
    // A briefly missing file is about to be replaced.
    if (!now || !isStill || now == m_known) {
        return false;
    }
    m_known = now;
    return true;
}

} // namespace zrm::host
