#include "host/http/DescriptorRoom.h"

#include <algorithm>

#include <sys/resource.h>
#include <sys/select.h>

namespace {

/// Descriptors beside those of the agent and of connections.
constexpr rlim_t spare = 64;

} // namespace

DescriptorRoom DescriptorRoom::make(std::size_t wanted) {
    constexpr rlim_t low = FD_SETSIZE; // below these, select can be used
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
        return {wanted, static_cast<int>(low)};
    }
    return {std::min<std::size_t>(wanted, limit.rlim_cur / 2), 0};
}
