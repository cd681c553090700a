#include "host/http/ConnectionShares.h"

#include <algorithm>

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/select.h>
#include <unistd.h>

namespace zrm::host {

std::size_t ConnectionShares::share(bool isLoopback) const noexcept {
    constexpr std::size_t least = 4;
    return isLoopback ? m_most * 3 / 4 : std::max(m_most / 8, least);
}

bool ConnectionShares::take(const std::string& address, bool isLoopback) {
    const std::lock_guard guard(m_mutex);
    const auto found = m_counts.find(address);
    const std::size_t own = found == m_counts.end() ? 0 : found->second;
    if (m_count >= m_most || own >= share(isLoopback)) {
        ++m_refused;
        return false;
    }
    ++m_counts[address];
    ++m_count;
    return true;
}

void ConnectionShares::release(const std::string& address) {
    const std::lock_guard guard(m_mutex);
    const auto found = m_counts.find(address);
    if (--found->second == 0) {
        m_counts.erase(found);
    }
    --m_count;
    m_changed.notify_all();
}

void ConnectionShares::countRefused() {
    const std::lock_guard guard(m_mutex);
    ++m_refused;
}

std::size_t ConnectionShares::count() const {
    const std::lock_guard guard(m_mutex);
    return m_count;
}

std::uint64_t ConnectionShares::refused() const {
    const std::lock_guard guard(m_mutex);
    return m_refused;
}

bool ConnectionShares::isTight() const {
    const std::lock_guard guard(m_mutex);
    return m_count * 4 > m_most * 3;
}

bool ConnectionShares::waitForNone(Clock::time_point limit) {
    std::unique_lock lock(m_mutex);
    return m_changed.wait_until(lock, limit, [&] { return m_count == 0; });
}

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
