#ifndef ZRM_HOST_CONNECTION_SHARES_H
#define ZRM_HOST_CONNECTION_SHARES_H

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <cstdint>
#include <map>
#include <mutex>
#include <string>

namespace zrm::host {

/// Counts the open connections, in total and per client address, and limits both: no address takes
/// all of them. Any thread.
class ConnectionShares {
public:
    using Clock = std::chrono::steady_clock;

    /// Sets how many there may be in total. Called before the first connection.
    void setMost(std::size_t most) noexcept { m_most = most; }

    /// How many of them one address may have. Clients on this machine, most of which share one
    /// address, get three quarters; others get an eighth, and at least four.
    std::size_t share(bool isLoopback) const noexcept;

    /// Counts a connection from this address. False, and counted as refused, when the total or the
    /// address's share is used up.
    bool take(const std::string& address, bool isLoopback);
    void release(const std::string& address);

    /// For a connection that was refused for another reason.
    void countRefused();

    std::size_t count() const;
    std::uint64_t refused() const;
    /// True when few are left: idle connections should be closed early.
    bool isTight() const;

    /// Waits until there are no connections, at most until the limit. True when there are none.
    bool waitForNone(Clock::time_point limit);

private:
    std::size_t m_most = 0;
    mutable std::mutex m_mutex; ///< guards what follows
    std::condition_variable m_changed;
    std::map<std::string, std::size_t> m_counts; ///< by address
    std::size_t m_count = 0;
    std::uint64_t m_refused = 0;
};

/// The descriptors of the process that connections may use.
struct DescriptorRoom {
    std::size_t count = 0; ///< number of connections
    int lowest = 0;        ///< the lowest descriptor for a connection

    /// Room for this many connections, or for as many as possible. Raises the process's soft limit
    /// of descriptors if it is too low, and leaves enough of them for the agent.
    static DescriptorRoom make(std::size_t wanted);
};

} // namespace zrm::host

#endif
