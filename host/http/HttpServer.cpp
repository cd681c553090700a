#include "host/http/HttpServer.h"

#include "agent/TraceScope.h"
#include "host/http/ClientConnection.h"
#include "host/http/DescriptorRoom.h"
#include "host/http/TlsSocket.h"

#include <exception>
#include <system_error>
#include <utility>

#include <fcntl.h>
#include <unistd.h>

namespace {

using namespace std::chrono_literals;

TRC1_Anchor anchor{"HttpServer.cpp"};

constexpr std::size_t mostConnections = 2048;
constexpr auto openTime = 10s; ///< for what goes before the first request

} // namespace

HttpServer::HttpServer(const Router& router)
    : m_dispatcher(router), m_exchange(m_dispatcher, m_streams.get_token()) {}

HttpServer::~HttpServer() {
    stop(Clock::time_point::max());
}

std::string HttpServer::start(const ListenAddress& address, ApiToken token,
                              std::shared_ptr<const TlsContext> tls) {
    TraceScope trace(anchor);
    if (!m_stop.isUsable()) {
        return "cannot make a pipe";
    }
    if (!m_listen.open(address)) {
        return "cannot listen at " + address.text() +
               (address.port == 0 ? "" : ": is another agent running?");
    }
    const DescriptorRoom room = DescriptorRoom::make(mostConnections);
    m_mostConnections = room.count;
    m_lowestDescriptor = room.lowest;
    m_tls = std::move(tls);
    m_dispatcher.setGuard(RequestGuard({address.host, port()}, std::move(token), m_tls));
    try {
        m_acceptor = std::thread([this] { acceptClients(); });
    } catch (const std::system_error& error) {
        m_listen.close();
        return std::string("cannot start a thread: ") + error.what();
    }
    trace.detail()("Listening at %s.", ListenAddress{address.host, port()}.text().c_str());
    return "";
}

void HttpServer::acceptClients() {
    while (!m_stop.isRaised()) {
        const int fd = m_listen.accept(m_stop.descriptor());
        if (fd != -1) {
            accept(fd);
        }
    }
}

// The agent watches descriptors with select, which knows low numbers alone: connections leave
// those to it, however many there are.
void HttpServer::accept(int fd) {
    TraceScope trace(anchor);
    const int moved = fcntl(fd, F_DUPFD_CLOEXEC, m_lowestDescriptor);
    close(fd);
    if (moved != -1 && m_threads.start([this, moved] { serve(moved); }, m_mostConnections)) {
        return;
    }
    ++m_refused;
    if (moved != -1) {
        close(moved);
        trace.detail()("Connection refused: %zu are open.", m_threads.count());
    }
}

// Idle connections leave early when there is little room for others.
std::chrono::milliseconds HttpServer::idleTime() const {
    return m_threads.count() * 4 > m_mostConnections * 3 ? 1s : 15s;
}

std::unique_ptr<ClientSocket> HttpServer::socketFor(int fd) const {
    if (m_tls != nullptr) {
        return std::make_unique<TlsSocket>(fd, m_stop, m_tls);
    }
    return std::make_unique<ClientSocket>(fd, m_stop);
}

void HttpServer::serve(int fd) {
    std::unique_ptr<ClientSocket> socket;
    try {
        socket = socketFor(fd);
        if (!socket->open(Clock::now() + openTime)) {
            return;
        }
        serveRequests(*socket);
    } catch (const std::exception& exception) {
        TraceScope trace(anchor);
        trace.error()("A connection broke off: %s", exception.what());
    }
    if (socket != nullptr) {
        socket->linger();
    } else {
        close(fd);
    }
}

void HttpServer::serveRequests(ClientSocket& socket) {
    ClientConnection connection(socket);
    for (std::size_t number = 0; number < HttpExchange::requestsPerConnection; ++number) {
        const ClientConnection::Head head = connection.readHead(idleTime());
        if (head == ClientConnection::NONE) {
            return;
        }
        if (head == ClientConnection::TOO_LONG) {
            m_exchange.refuse(connection, {431, "the head has more than 16384 bytes", ""});
            return;
        }
        if (head == ClientConnection::TOO_SLOW) {
            m_exchange.refuse(connection, {408, "the request did not come within 10 s", ""});
            return;
        }
        const bool isLast = number + 1 == HttpExchange::requestsPerConnection;
        if (!m_exchange.serve(connection, isLast || m_stop.isRaised()) || m_stop.isRaised()) {
            return;
        }
    }
}

void HttpServer::stop(Clock::time_point limit) {
    TraceScope trace(anchor);
    if (!m_acceptor.joinable()) {
        return;
    }
    m_stop.raise();
    m_streams.request_stop();
    m_acceptor.join();
    m_listen.close();
    if (!m_threads.waitForAll(limit)) {
        trace.detail()("Clients are still being served.");
        m_dispatcher.close(limit);
    }
}

void HttpServer::abandon(Clock::time_point limit) {
    m_streams.request_stop();
    m_dispatcher.close(limit);
}
