#ifndef ZRM_TESTS_LOCAL_SOCKET_H
#define ZRM_TESTS_LOCAL_SOCKET_H

#include <cstdint>

#include <arpa/inet.h>
#include <netinet/in.h>
#include <sys/socket.h>

/// The address of a port of this machine.
inline sockaddr_in localAddress(std::uint16_t port) {
    sockaddr_in address{};
    address.sin_family = AF_INET;
    address.sin_addr.s_addr = htonl(INADDR_LOOPBACK);
    address.sin_port = htons(port);
    return address;
}

/// A socket at a port of this machine; port 0 becomes a free one.
inline int localSocket(int type, std::uint16_t& port) {
    const int made = socket(AF_INET, type | SOCK_CLOEXEC, 0);
    const int on = 1;
    setsockopt(made, SOL_SOCKET, SO_REUSEADDR, &on, sizeof on);
    sockaddr_in address = localAddress(port);
    bind(made, reinterpret_cast<const sockaddr*>(&address), sizeof address);
    socklen_t size = sizeof address;
    getsockname(made, reinterpret_cast<sockaddr*>(&address), &size);
    port = ntohs(address.sin_port);
    return made;
}

#endif
