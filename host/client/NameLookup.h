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
    /// The numeric address, without the port.
    std::string text() const;
};

/// Finds the addresses of a host. The system may take minutes to look up a name and cannot be
/// interrupted, so a lookup runs on its own thread, which is abandoned after the caller's limit.
/// The next call waits for one that is still running, so there is never more than one. Used by one
/// thread, whose blocked signals the lookup's thread inherits.
class NameLookup {
public:
    using Clock = std::chrono::steady_clock;

    NameLookup(std::string host, std::uint16_t port);
    ~NameLookup();
    NameLookup(const NameLookup&) = delete;
    NameLookup& operator=(const NameLookup&) = delete;

    /// The addresses, best first; empty when there are none, as error() explains, when the time is
    /// up, or when giving up is requested. Throws std::system_error when no thread can be started.
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
