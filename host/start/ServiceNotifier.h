#ifndef ZRM_HOST_SERVICENOTIFIER_H
#define ZRM_HOST_SERVICENOTIFIER_H

#include <string>
#include <utility>

namespace zrm::host {

/// Reports the state of this process to the service manager that started it: one datagram per
/// message to the socket named by NOTIFY_SOCKET. Without a service manager, messages are dropped.
/// Immutable; any thread.
class ServiceNotifier {
public:
    /// Sends nothing.
    ServiceNotifier() = default;

    /// @param address the path of a socket, or '@' and an abstract name; empty: send nothing
    explicit ServiceNotifier(std::string address) : m_address(std::move(address)) {}

    /// The service manager named in the environment. Removes NOTIFY_SOCKET, so that no command run
    /// by the agent can send messages in its place. Call while there is only one thread.
    static ServiceNotifier takeFromEnvironment();

    /// Startup is complete. A failure is traced.
    void ready() const { send("READY=1"); }

    /// Shutdown has begun. A failure is traced.
    void stopping() const { send("STOPPING=1"); }

private:
    void send(const char* message) const;

    std::string m_address;
};

} // namespace zrm::host

#endif
