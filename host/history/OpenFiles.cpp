#include "host/history/OpenFiles.h"

#include <cerrno>
#include <utility>

#include <sys/stat.h>
#include <unistd.h>

namespace zrm::host {

OpenFiles::OpenFiles(std::string path) : m_path(std::move(path)) {
    for (std::size_t which = 0; which < endings.size(); ++which) {
        m_opened[which] = identity(which);
    }
}

std::optional<OpenFiles::Identity> OpenFiles::identity(std::size_t which) const {
    struct stat status {};
    if (stat((m_path + endings[which]).c_str(), &status) != 0) {
        return std::nullopt;
    }
    return Identity{status.st_dev, status.st_ino};
}

bool OpenFiles::isInPlace(std::size_t which) const {
    errno = 0;
    const std::optional<Identity> now = identity(which);
    // A directory that currently cannot be read says nothing about its files.
    return now ? now == m_opened[which] : !m_opened[which] || (errno != ENOENT && errno != ENOTDIR);
}

OpenFiles::State OpenFiles::state() const {
    if (!isInPlace(0)) {
        return State::REMOVED;
    }
    return isInPlace(1) && isInPlace(2) ? State::IN_PLACE : State::WITHOUT_LOG;
}

void OpenFiles::removeLog() const {
    for (std::size_t which = 1; which < endings.size(); ++which) {
        if (m_opened[which] && identity(which) == m_opened[which]) {
            unlink((m_path + endings[which]).c_str());
        }
    }
}

} // namespace zrm::host
