#include "host/sinks/ConnectionLimit.h"

#include <algorithm>
#include <utility>

#include <fcntl.h>
#include <sys/socket.h>
#include <unistd.h>

namespace {

/// How often a shutdown is repeated: a connection that is only being made may take no notice.
constexpr std::chrono::milliseconds repeatInterval{20};

} // namespace

ConnectionLimit::ConnectionLimit(Clock::time_point end, std::stop_token giveUp)
    : m_end(end), m_giveUp(std::move(giveUp)),
      m_thread([this](const std::stop_token& done) { run(done); }) {}

ConnectionLimit::~ConnectionLimit() {
    m_thread.request_stop();
    m_thread.join();
    watch(-1);
}

void ConnectionLimit::watch(int socket) {
    const std::lock_guard guard(m_mutex);
    if (m_socket != -1) {
        close(m_socket);
    }
    m_socket = socket == -1 ? -1 : fcntl(socket, F_DUPFD_CLOEXEC, 0);
}

bool ConnectionLimit::hasEnded() const {
    const std::lock_guard guard(m_mutex);
    return m_hasEnded;
}

void ConnectionLimit::run(const std::stop_token& done) {
    const std::stop_callback wakeUp(m_giveUp, [this] {
        const std::lock_guard guard(m_mutex);
        m_changed.notify_all();
    });
    std::unique_lock lock(m_mutex);
    m_changed.wait_until(lock, done, m_end, [this] { return m_giveUp.stop_requested(); });
    while (!done.stop_requested()) {
        m_hasEnded = true;
        if (m_socket != -1) {
            shutdown(m_socket, SHUT_RDWR);
        }
        m_changed.wait_for(lock, done, repeatInterval, [] { return false; });
    }
}
