#include "monitor/DescriptorReserve.h"

#include <algorithm>
#include <atomic>
#include <cerrno>

#include <sys/resource.h>

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

} // namespace

std::uint64_t DescriptorReserve::size() {
    return std::min(mostReserved, limitOfDescriptors() / partReserved);
}

bool DescriptorReserve::has(int descriptor) {
    // A new descriptor is always the lowest free one. A high number means that few are left.
    const rlim_t limit = limitOfDescriptors();
    return limit != 0 && static_cast<rlim_t>(descriptor) >= limit - size();
}

void DescriptorReserve::noteFailure(int number) noexcept {
    if (number == EMFILE || number == ENFILE) {
        failed.fetch_add(1, std::memory_order_relaxed);
    }
}

std::uint64_t DescriptorReserve::failures() noexcept {
    return failed.load(std::memory_order_relaxed);
}

} // namespace zrm
