#include "host/base/ForkedChild.h"

#include <atomic>

#include <unistd.h>

namespace zrm::host {

namespace {

std::atomic<pid_t> g_process{0};

} // namespace

bool ForkedChild::isCaller() noexcept {
    const pid_t self = getpid();
    pid_t expected = 0;
    return !g_process.compare_exchange_strong(expected, self, std::memory_order_relaxed) &&
           expected != self;
}

} // namespace zrm::host
