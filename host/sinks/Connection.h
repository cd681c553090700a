#ifndef ZRM_HOST_CONNECTION_H
#define ZRM_HOST_CONNECTION_H

#include "host/base/ListenAddress.h"
#include "host/client/NameLookup.h"

#include <chrono>
#include <cstddef>
#include <stop_token>
#include <string>
#include <string_view>

namespace zrm::host {

/// A connection over TCP or UDP to a receiver that does not answer. Every wait ends when its time
/// is up or giving up is requested. Used by one thread.
class Connection {
public:
    enum class Transport { TCP, UDP };
    using enum Transport;

    /// Not open yet. `timeout` is for each wait.
    Connection(ListenAddress receiver, Transport transport, std::chrono::milliseconds timeout);
    ~Connection();
    Connection(const Connection&) = delete;
    Connection& operator=(const Connection&) = delete;

    /// Opens the connection when it is closed. False when it could not be opened.
    bool open(const std::stop_token& giveUp);
    bool isOpen() const noexcept { return m_socket != -1; }

    /// Closes the connection when the other side has closed it, it has failed, or the other side
    /// keeps sending.
    void closeIfBroken();

    /// Sends all bytes, over UDP as one message. A failure closes the connection.
    bool send(std::string_view bytes, const std::stop_token& giveUp);

    /// How many of the sent bytes the receiver's system has not acknowledged; 0 if unknown.
    std::size_t unacknowledged() const;

    /// Why the last operation failed.
    const std::string& error() const noexcept { return m_error; }

private:
    bool connect(const SocketAddress& address, const std::stop_token& giveUp);
    bool wait(short events, const std::stop_token& giveUp);
    bool fail(const char* call, int number);
    void close();

    const ListenAddress m_receiver;
    const Transport m_transport;
    const std::chrono::milliseconds m_timeout;
    NameLookup m_lookup;
    int m_socket = -1;
    std::string m_error;
};

} // namespace zrm::host

#endif
