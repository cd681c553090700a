#include "host/start/ServiceNotifier.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"

#include <cerrno>
#include <cstddef>
#include <cstdlib>
#include <cstring>

#include <sys/socket.h>
#include <sys/un.h>
#include <unistd.h>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"ServiceNotifier.cpp"};

constexpr const char* variable = "NOTIFY_SOCKET";

/// Sends one datagram to the address; false with errno set on failure.
bool sendDatagram(const std::string& address, const char* message) {
    sockaddr_un target{};
    target.sun_family = AF_UNIX;
    if (address.size() > sizeof target.sun_path || (address[0] != '/' && address[0] != '@')) {
        errno = EINVAL;
        return false;
    }
    std::memcpy(target.sun_path, address.data(), address.size());
    if (address[0] == '@') {
        target.sun_path[0] = '\0';
    }
    const auto length = static_cast<socklen_t>(offsetof(sockaddr_un, sun_path) + address.size());
    const int fd = socket(AF_UNIX, SOCK_DGRAM | SOCK_CLOEXEC, 0);
    if (fd == -1) {
        return false;
    }
    const bool isSent = sendto(fd, message, std::strlen(message), MSG_NOSIGNAL,
                               reinterpret_cast<const sockaddr*>(&target), length) != -1;
    const int number = errno;
    close(fd);
    errno = number;
    return isSent;
}

} // namespace

ServiceNotifier ServiceNotifier::takeFromEnvironment() {
    const char* const address = std::getenv(variable);
    ServiceNotifier notifier(address == nullptr ? "" : address);
    unsetenv(variable);
    return notifier;
}

void ServiceNotifier::send(const char* message) const {
    TraceScope trace(anchor);
    if (m_address.empty()) {
        return;
    }
    if (sendDatagram(m_address, message)) {
        trace.detail()("Told the service manager %s.", message);
        return;
    }
    const ErrorText error(errno);
    trace.error()("Cannot tell the service manager %s at %s. errno = %d; %s.", message,
                  m_address.c_str(), error.number(), error.text());
}

} // namespace zrm::host
