#include "host/http/ClientSocket.h"

#include <algorithm>
#include <cerrno>

#include <fcntl.h>
#include <netinet/in.h>
#include <netinet/tcp.h>
#include <poll.h>
#include <sys/socket.h>
#include <unistd.h>

namespace {

using namespace std::chrono_literals;
using Clock = ClientSocket::Clock;

constexpr auto noProgress = 5s;         ///< for a client that takes no byte
constexpr auto noProgressAtTheEnd = 1s; ///< the same while the server stops
constexpr auto lingering = 1s;
constexpr std::size_t lingeringBytes = 4 * 1024 * 1024;

int millisecondsUntil(Clock::time_point deadline) {
    const auto left = std::chrono::ceil<std::chrono::milliseconds>(deadline - Clock::now());
    return static_cast<int>(std::clamp<long long>(left.count(), 0, 3'600'000));
}

/// What to wait for after a call that could not go on; 0 when the connection is broken.
ssize_t notYet(short events, short& wanted) {
    if (errno == EAGAIN || errno == EWOULDBLOCK || errno == EINTR) {
        wanted = events;
        return -1;
    }
    return 0;
}

} // namespace

ClientSocket::ClientSocket(int fd, const StopSignal& stop) : m_fd(fd), m_stop(stop) {
    const int on = 1;
    fcntl(m_fd, F_SETFL, O_NONBLOCK);
    setsockopt(m_fd, IPPROTO_TCP, TCP_NODELAY, &on, sizeof on);
}

ClientSocket::~ClientSocket() {
    close(m_fd);
}

bool ClientSocket::open(Clock::time_point /*deadline*/) {
    return true;
}

bool ClientSocket::wait(short events, Clock::time_point deadline, bool heedsStop) const {
    pollfd waited[] = {{m_fd, events, 0}, {m_stop.descriptor(), POLLIN, 0}};
    const nfds_t count = heedsStop ? 2 : 1;
    int ready = 0;
    do {
        ready = poll(waited, count, millisecondsUntil(deadline));
    } while (ready == -1 && errno == EINTR);
    return ready > 0 && waited[0].revents != 0;
}

std::size_t ClientSocket::receive(char* bytes, std::size_t size, Clock::time_point deadline,
                                  Outcome& outcome) {
    for (;;) {
        short wanted = 0;
        const ssize_t count = tryReceive(bytes, size, wanted);
        if (count >= 0) {
            outcome = CLOSED;
            return static_cast<std::size_t>(count);
        }
        // What a client trickles in must not put the deadline off.
        if (Clock::now() >= deadline || !wait(wanted, deadline, true)) {
            outcome = m_stop.isRaised() ? STOPPED : TIMEOUT;
            return 0;
        }
    }
}

bool ClientSocket::send(std::string_view bytes, Clock::time_point deadline) {
    Clock::time_point progress = Clock::now();
    while (!bytes.empty()) {
        short wanted = 0;
        const ssize_t count = trySend(bytes.data(), bytes.size(), wanted);
        if (count > 0) {
            bytes.remove_prefix(static_cast<std::size_t>(count));
            progress = Clock::now();
            if (progress >= deadline) {
                return bytes.empty();
            }
            continue;
        }
        if (count == 0) {
            return false;
        }
        const bool stops = m_stop.isRaised();
        const auto limit = std::min(deadline, progress + (stops ? noProgressAtTheEnd : noProgress));
        // A stop that comes during the wait ends it, and brings the limit forward.
        if (!wait(wanted, limit, !stops) && Clock::now() >= limit) {
            return false;
        }
    }
    return true;
}

bool ClientSocket::isGone() {
    char byte = 0;
    const ssize_t count = recv(m_fd, &byte, 1, MSG_PEEK | MSG_DONTWAIT);
    return count == 0 || (count == -1 && errno != EAGAIN && errno != EWOULDBLOCK && errno != EINTR);
}

void ClientSocket::linger() {
    sayFarewell();
    shutdown(m_fd, SHUT_WR);
    const Clock::time_point deadline = Clock::now() + lingering;
    char bytes[16384];
    for (std::size_t total = 0; total < lingeringBytes && Clock::now() < deadline;) {
        const ssize_t count = recv(m_fd, bytes, sizeof bytes, 0);
        if (count > 0) {
            total += static_cast<std::size_t>(count);
        } else if (count == 0 || (errno != EAGAIN && errno != EWOULDBLOCK && errno != EINTR) ||
                   !wait(POLLIN, deadline, true)) {
            return;
        }
    }
}

ssize_t ClientSocket::tryReceive(char* bytes, std::size_t size, short& wanted) {
    const ssize_t count = recv(m_fd, bytes, size, 0);
    return count >= 0 ? count : notYet(POLLIN, wanted);
}

ssize_t ClientSocket::trySend(const char* bytes, std::size_t size, short& wanted) {
    const ssize_t count = ::send(m_fd, bytes, size, MSG_NOSIGNAL);
    return count >= 0 ? count : notYet(POLLOUT, wanted);
}
