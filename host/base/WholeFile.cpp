#include "host/base/WholeFile.h"

#include <algorithm>
#include <cerrno>

#include <unistd.h>

namespace zrm::host {

Result<std::string, int> WholeFile::read(int fd, std::size_t most) {
    std::string text;
    char buffer[65536];
    ssize_t count = 0;
    while (text.size() <= most &&
           ((count = ::read(fd, buffer, sizeof buffer)) > 0 || (count == -1 && errno == EINTR))) {
        text.append(buffer, static_cast<std::size_t>(std::max<ssize_t>(count, 0)));
    }
    if (count == -1) {
        return tl::unexpected(errno);
    }
    if (text.size() > most) {
        return tl::unexpected(EFBIG);
    }
    return text;
}

Result<void, int> WholeFile::write(int fd, std::string_view text) {
    while (!text.empty()) {
        const ssize_t written = ::write(fd, text.data(), text.size());
        if (written == -1 && errno != EINTR) {
            return tl::unexpected(errno);
        }
        text.remove_prefix(static_cast<std::size_t>(std::max<ssize_t>(written, 0)));
    }
    if (fsync(fd) != 0) {
        return tl::unexpected(errno);
    }
    return {};
}

} // namespace zrm::host
