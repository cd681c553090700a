#include "host/http/ListenSocket.h"

#include <cerrno>
#include <cstddef>
#include <memory>
#include <string>

#include <fcntl.h>
#include <netdb.h>
#include <netinet/in.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

namespace {

/// Clients that have connected and wait to be accepted.
constexpr int waitingClients = 512;

using Addresses = std::unique_ptr<addrinfo, void (*)(addrinfo*)>;

Addresses resolve(const ListenAddress& address) {
    addrinfo hints{};
    hints.ai_family = AF_UNSPEC;
    hints.ai_socktype = SOCK_STREAM;
    hints.ai_flags = AI_PASSIVE | AI_NUMERICSERV;
    addrinfo* found = nullptr;
    const std::string port = std::to_string(address.port);
    const int result = getaddrinfo(address.host.c_str(), port.c_str(), &hints, &found);
    return {result == 0 ? found : nullptr, [](addrinfo* list) {
                if (list != nullptr) {
                    freeaddrinfo(list);
                }
            }};
}

/// A listening socket, or -1. Two servers on one port would share its clients: an address in use
/// is refused.
int listening(const addrinfo& address) {
    const int fd =
        socket(address.ai_family, address.ai_socktype | SOCK_CLOEXEC, address.ai_protocol);
    if (fd == -1) {
        return -1;
    }
    const int on = 1;
    fcntl(fd, F_SETFL, O_NONBLOCK); // a client may be gone when it is accepted
    setsockopt(fd, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
    if (bind(fd, address.ai_addr, address.ai_addrlen) == 0 && listen(fd, waitingClients) == 0) {
        return fd;
    }
    close(fd);
    return -1;
}

std::uint16_t portOf(int fd) {
    sockaddr_storage name{};
    socklen_t size = sizeof name;
    if (getsockname(fd, reinterpret_cast<sockaddr*>(&name), &size) == -1) {
        return 0;
    }
    return ntohs(name.ss_family == AF_INET6 ? reinterpret_cast<sockaddr_in6*>(&name)->sin6_port
                                            : reinterpret_cast<sockaddr_in*>(&name)->sin_port);
}

} // namespace

bool ListenSocket::open(const ListenAddress& address) {
    const Addresses addresses = resolve(address);
    for (const addrinfo* one = addresses.get(); one != nullptr && m_fd == -1; one = one->ai_next) {
        m_fd = listening(*one);
    }
    m_port = m_fd == -1 ? 0 : portOf(m_fd);
    return m_fd != -1;
}

int ListenSocket::accept(int other) const {
    pollfd waited[] = {{m_fd, POLLIN, 0}, {other, POLLIN, 0}};
    constexpr int forEver = -1;
    if (poll(waited, 2, forEver) <= 0 || waited[1].revents != 0) {
        return -1;
    }
    // At once not for children: one that begins meanwhile would keep the client's connection open.
    const int fd = accept4(m_fd, nullptr, nullptr, SOCK_CLOEXEC);
    if (fd == -1 && errno != EAGAIN && errno != EINTR && errno != ECONNABORTED) {
        constexpr int pause = 50; // milliseconds: descriptors are short, and the client still waits
        poll(&waited[1], 1, pause);
    }
    return fd;
}

void ListenSocket::close() noexcept {
    if (m_fd != -1) {
        ::close(m_fd);
        m_fd = -1;
    }
}
