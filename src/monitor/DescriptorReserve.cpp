#include "monitor/DescriptorReserve.h"

#include <algorithm>
#include <atomic>
#include <cerrno>

#include <fcntl.h>
#include <sys/resource.h>
#include <unistd.h>

namespace zrm {

namespace {

constexpr rlim_t mostReserved = 256;
constexpr rlim_t partReserved = 4;

std::atomic<std::uint64_t> failed{0};

/// 0 if there is no limit.
rlim_t limitOfDescriptors() {
    rlimit limit{};
    const bool isLimited = getrlimit(RLIMIT_NOFILE, &limit) == 0 && limit.rlim_cur != RLIM_INFINITY;
    return isLimited ? limit.rlim_cur : 0;
}

bool isInReserve(int descriptor) {
    // A new descriptor is always the lowest free one. A high number means that few are left.
    const rlim_t limit = limitOfDescriptors();
    return limit != 0 && static_cast<rlim_t>(descriptor) >= limit - DescriptorReserve::size();
}

} // namespace

std::uint64_t DescriptorReserve::size() {
    return std::min(mostReserved, limitOfDescriptors() / partReserved);
}

int DescriptorReserve::openLog(const char* path) noexcept {
    int descriptor = open(path, O_RDONLY | O_NONBLOCK | O_CLOEXEC);
    if (descriptor >= 0 && isInReserve(descriptor)) {
        close(descriptor);
        descriptor = -1;
        errno = EMFILE;
    }
    if (descriptor < 0 && (errno == EMFILE || errno == ENFILE)) {
        failed.fetch_add(1, std::memory_order_relaxed);
    }
    return descriptor;
}

std::uint64_t DescriptorReserve::failures() noexcept {
    return failed.load(std::memory_order_relaxed);
}

} // namespace zrm
