#include "host/sinks/Connection.h"

#include "base/TraceScope.h"
#include "host/base/Result.h"

#include <algorithm>
#include <cerrno>
#include <utility>
#include <vector>

#include <fcntl.h>
#include <poll.h>
#include <sys/ioctl.h>
#include <sys/socket.h>
#include <unistd.h>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"Connection.cpp"};

using Clock = std::chrono::steady_clock;

constexpr int pollSlice = 100; ///< milliseconds

/// The most data accepted between two deliveries from a receiver that should send none.
constexpr std::size_t mostHeard = 256 * 1024; ///< bytes

} // namespace

Connection::Connection(ListenAddress receiver, Transport transport,
                       std::chrono::milliseconds timeout)
    : m_receiver(std::move(receiver)), m_transport(transport), m_timeout(timeout),
      m_lookup(m_receiver.host, m_receiver.port) {}

Connection::~Connection() {
    closeIfBroken(); // closing with unread data would discard what is still to be sent
    close();
}

void Connection::close() {
    if (m_socket != -1) {
        ::close(m_socket);
        m_socket = -1;
    }
}

bool Connection::fail(const char* call, int number) {
    m_error = because(std::string(call) + " failed", number) + " (" + m_receiver.text() + ')';
    return false;
}

bool Connection::wait(short events, const std::stop_token& giveUp) {
    const Clock::time_point end = Clock::now() + m_timeout;
    while (!giveUp.stop_requested()) {
        struct pollfd descriptor = {m_socket, events, 0};
        const auto left =
            std::chrono::duration_cast<std::chrono::milliseconds>(end - Clock::now()).count();
        const int ready =
            poll(&descriptor, 1, static_cast<int>(std::clamp<long>(left, 0, pollSlice)));
        if (ready > 0) {
            return true; // whatever poll reports, the next call fails with the right errno
        }
        if (ready == -1 && errno != EINTR) {
            return fail("poll", errno);
        }
        if (left <= 0) {
            m_error = m_receiver.text() + " takes nothing";
            return false;
        }
    }
    m_error = "the agent is stopping (" + m_receiver.text() + ')';
    return false;
}

bool Connection::connect(const SocketAddress& address, const std::stop_token& giveUp) {
    const int type = m_transport == TCP ? SOCK_STREAM : SOCK_DGRAM;
    m_socket = socket(address.family(), type | SOCK_CLOEXEC | SOCK_NONBLOCK, 0);
    if (m_socket == -1) {
        return fail("socket", errno);
    }
    if (::connect(m_socket, address.pointer(), address.size) == 0) {
        return true;
    }
    if (errno != EINPROGRESS) {
        return fail("connect", errno);
    }
    int number = 0;
    socklen_t size = sizeof number;
    if (!wait(POLLOUT, giveUp)) {
        return false;
    }
    getsockopt(m_socket, SOL_SOCKET, SO_ERROR, &number, &size);
    return number == 0 || fail("connect", number);
}

bool Connection::open(const std::stop_token& giveUp) {
    TraceScope trace(anchor);
    if (isOpen()) {
        return trace.result(true);
    }
    const std::vector<SocketAddress> addresses = m_lookup.find(Clock::now() + m_timeout, giveUp);
    if (addresses.empty()) {
        m_error = giveUp.stop_requested()
                      ? "the agent is stopping (" + m_receiver.text() + ')'
                      : m_receiver.text() + " is not known: " + m_lookup.error();
    }
    for (const SocketAddress& address : addresses) {
        if (connect(address, giveUp)) {
            return trace.result(true);
        }
        close();
    }
    return trace.result(false);
}

void Connection::closeIfBroken() {
    char buffer[4096];
    std::size_t heard = 0;
    while (isOpen() && m_transport == TCP) {
        const ssize_t count = recv(m_socket, buffer, sizeof buffer, MSG_DONTWAIT);
        if (count == -1 && errno == EAGAIN) {
            return; // nothing to read: the connection is up
        }
        heard += count > 0 ? static_cast<std::size_t>(count) : 0;
        if (count == 0 || (count == -1 && errno != EINTR) || heard > mostHeard) {
            close();
        }
    }
}

bool Connection::send(std::string_view bytes, const std::stop_token& giveUp) {
    while (!bytes.empty()) {
        const ssize_t count = ::send(m_socket, bytes.data(), bytes.size(), MSG_NOSIGNAL);
        if (count >= 0) {
            bytes.remove_prefix(static_cast<std::size_t>(count));
        } else if (errno != EINTR &&
                   (errno == EAGAIN ? !wait(POLLOUT, giveUp) : !fail("send", errno))) {
            // Over TCP a message may have been sent in part; a UDP socket is bound to an address
            // that this machine may have lost.
            close();
            return false;
        }
    }
    return true;
}

std::size_t Connection::unacknowledged() const {
    int count = 0;
    return isOpen() && ioctl(m_socket, TIOCOUTQ, &count) == 0 && count > 0
               ? static_cast<std::size_t>(count)
               : 0;
}

} // namespace zrm::host
