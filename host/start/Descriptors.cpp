#include "host/start/Descriptors.h"

#include "host/base/Say.h"
#include "monitor/DescriptorReserve.h"

#include <algorithm>
#include <cinttypes>

#include <fcntl.h>
#include <sys/resource.h>
#include <unistd.h>

namespace zrm::host {

void StandardStreams::fill() noexcept {
    // Read-only: writes fail instead of losing data silently.
    int fd = open("/dev/null", O_RDONLY);
    while (fd != -1 && fd <= STDERR_FILENO) {
        fd = open("/dev/null", O_RDONLY);
    }
    if (fd != -1) {
        close(fd);
    }
}

namespace {

/// Far more than one agent has logs. An unlimited number costs memory in other programs that close
/// all inherited descriptors.
constexpr rlim_t mostDescriptors = 65536;

} // namespace

void Descriptors::raiseLimit() {
    rlimit limit{};
    if (getrlimit(RLIMIT_NOFILE, &limit) == 0 && limit.rlim_cur < mostDescriptors) {
        limit.rlim_cur = std::min(limit.rlim_max, mostDescriptors);
        setrlimit(RLIMIT_NOFILE, &limit);
    }
}

void Descriptors::tick() {
    const std::uint64_t failures = DescriptorReserve::failures();
    if (failures == m_seen && failures > m_told) {
        rlimit limit{};
        getrlimit(RLIMIT_NOFILE, &limit);
        say("%" PRIu64 " logs could not be opened: of %ju descriptors %" PRIu64
            " are kept for HTTP, the history and the sinks, and no other is free; raise the limit "
            "(LimitNOFILE= of the service, ulimit -n) and restart the agent",
            failures - m_told, static_cast<std::uintmax_t>(limit.rlim_cur),
            DescriptorReserve::size());
        m_told = failures;
    }
    m_seen = failures;
}

} // namespace zrm::host
