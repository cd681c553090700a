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

/// Counts the open connections, in all and for each client's address, and bounds both: no address
/// takes all places. Any thread.
class ConnectionShares {
public:
    using Clock = std::chrono::steady_clock;

    /// Before the first connection: how many there may be in all.
    void setMost(std::size_t most) noexcept { m_most = most; }

    /// The part of all places that one address may take. Clients of this machine, of which most
    /// have one address, get three quarters; others an eighth, and at least four.
    std::size_t share(bool isLoopback) const noexcept;

    /// Takes a place for a connection of this address. False, and counted as refused, when there is
    /// none, or when the address has its share.
    bool take(const std::string& address, bool isLoopback);
    void release(const std::string& address);

    /// For a connection that found no place for another reason.
    void countRefused();

    std::size_t count() const;
    std::uint64_t refused() const;
    /// True when few places are left: idle connections should leave early.
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
