#ifndef ZRM_HOST_SERVICENOTIFIER_H
#define ZRM_HOST_SERVICENOTIFIER_H

#include <string>
#include <utility>

namespace zrm::host {

/// Tells the service manager that started this process how it is doing: one datagram per message
/// to the socket that NOTIFY_SOCKET names. Without a service manager every message goes nowhere.
/// Immutable; any thread.
class ServiceNotifier {
public:
    /// Tells nobody.
    ServiceNotifier() = default;

    /// @param address the path of a socket, or '@' and an abstract name; empty for nobody
    explicit ServiceNotifier(std::string address) : m_address(std::move(address)) {}

    /// The service manager of the environment. NOTIFY_SOCKET is removed from it, so that no command
    /// which the agent runs speaks in its place. While there is one thread.
    static ServiceNotifier takeFromEnvironment();

    /// The start is over: everything is served. A failure is traced.
    void ready() const { send("READY=1"); }

    /// The orderly end has begun. A failure is traced.
    void stopping() const { send("STOPPING=1"); }

private:
    void send(const char* message) const;

    std::string m_address;
};

} // namespace zrm::host

#endif
