#include "host/http/DescriptorRoom.h"

#include <algorithm>

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/select.h>
#include <unistd.h>

namespace zrm::host {

namespace {

/// Descriptors besides those of the agent and of connections.
constexpr rlim_t spare = 64;

/// Makes the system enlarge the process's descriptor table up to this one. Otherwise it does so on
/// demand, which in a process with threads takes many milliseconds that the first client would have
/// to wait.
void enlargeTable(int descriptor) {
    const int opened = open("/dev/null", O_RDONLY | O_CLOEXEC);
    const int moved = opened != -1 ? fcntl(opened, F_DUPFD_CLOEXEC, descriptor) : -1;
    for (const int fd : {opened, moved}) {
        if (fd != -1) {
            close(fd);
        }
    }
}

} // namespace

DescriptorRoom DescriptorRoom::make(std::size_t wanted) {
    constexpr rlim_t low = FD_SETSIZE; // select can be used below this
    const rlim_t needed = low + static_cast<rlim_t>(wanted) + spare;
    rlimit limit{};
    if (getrlimit(RLIMIT_NOFILE, &limit) == -1) {
        return {spare, 0};
    }
    if (limit.rlim_cur < needed) {
        rlimit raised = limit;
        raised.rlim_cur = std::min(needed, limit.rlim_max);
        if (setrlimit(RLIMIT_NOFILE, &raised) == 0) {
            limit = raised;
        }
    }
    if (limit.rlim_cur >= needed) {
        enlargeTable(static_cast<int>(low));
        return {wanted, static_cast<int>(low)};
    }
    return {std::min<std::size_t>(wanted, limit.rlim_cur / 2), 0};
}

} // namespace zrm::host
