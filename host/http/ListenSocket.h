#ifndef ZRM_HOST_LISTEN_SOCKET_H
#define ZRM_HOST_LISTEN_SOCKET_H

#include "host/http/ListenAddress.h"

#include <cstdint>

/// A socket at which clients connect. One thread at a time.
class ListenSocket {
public:
    ListenSocket() = default;
    ~ListenSocket() { close(); }
    ListenSocket(const ListenSocket&) = delete;
    ListenSocket& operator=(const ListenSocket&) = delete;

    /// Begins to listen. False when it cannot, for example because the port is in use.
    bool open(const ListenAddress& address);

    /// The port, also where a free one was asked for.
    std::uint16_t port() const noexcept { return m_port; }

    /// Waits until a client connects, at most until the other descriptor can be read. The client's
    /// socket, or -1: there is none this time, ask again.
    int accept(int other) const;

    void close() noexcept;

private:
    int m_fd = -1;
    std::uint16_t m_port = 0;
};

#endif
