#ifndef ZRM_HOST_NAME_LOOKUP_H
#define ZRM_HOST_NAME_LOOKUP_H

#include <chrono>
#include <cstdint>
#include <memory>
#include <stop_token>
#include <string>
#include <vector>

#include <sys/socket.h>

namespace zrm::host {

/// Where a receiver can be reached.
struct SocketAddress {
    sockaddr_storage address{};
    socklen_t size = 0;

    int family() const noexcept { return address.ss_family; }
    const sockaddr* pointer() const noexcept { return reinterpret_cast<const sockaddr*>(&address); }
    /// The address in digits, without the port.
    std::string text() const;
};

/// Finds the addresses of a host. The system may take minutes to look a name up and cannot be told
/// to stop: it does so on a thread of its own, for which nobody waits longer than he wants. One
/// that still runs is waited for by the next call, so that there is never more than one. Used by
/// one thread, whose blocked signals the other one inherits.
class NameLookup {
public:
    using Clock = std::chrono::steady_clock;

    NameLookup(std::string host, std::uint16_t port);
    ~NameLookup();
    NameLookup(const NameLookup&) = delete;
    NameLookup& operator=(const NameLookup&) = delete;

    /// The addresses, best first; none when there are none, which error() explains, when the time
    /// is over, or when giving up is requested. Throws std::system_error when there can be no
    /// thread.
    std::vector<SocketAddress> find(Clock::time_point limit, const std::stop_token& giveUp);

    /// Why nothing was found.
    const std::string& error() const noexcept { return m_error; }

private:
    struct Answer;
    struct Lookup;

    static Answer ask(const std::string& host, std::uint16_t port, int flags);

    const std::string m_host;
    const std::uint16_t m_port;
    std::shared_ptr<Lookup> m_underWay; ///< shared with the thread
    std::string m_error;
};

} // namespace zrm::host

#endif
