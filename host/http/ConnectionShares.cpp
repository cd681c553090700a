#include "host/http/ConnectionShares.h"

#include <algorithm>

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

} // namespace zrm::host
