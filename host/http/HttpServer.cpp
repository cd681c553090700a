#include "host/http/HttpServer.h"

#include "base/TraceScope.h"
#include "host/http/ConnectionShares.h"
#include "host/http/HttpConnection.h"
#include "host/http/RequestDispatcher.h"
#include "host/http/WorkerPool.h"

#include <algorithm>
#include <array>
#include <cerrno>
#include <exception>
#include <map>
#include <mutex>
#include <system_error>
#include <thread>
#include <utility>
#include <vector>

#include <boost/asio/executor_work_guard.hpp>
#include <boost/asio/io_context.hpp>
#include <boost/asio/ip/tcp.hpp>
#include <boost/asio/post.hpp>
#include <boost/asio/steady_timer.hpp>
#include <fcntl.h>
#include <sys/socket.h>
#include <unistd.h>

namespace zrm::host {

namespace {

namespace asio = boost::asio;
using asio::ip::tcp;
using Error = boost::system::error_code;

TRC1_Anchor anchor{"HttpServer.cpp"};

constexpr std::size_t networkThreads = 2;
constexpr int waitingClients = 512; ///< that have connected and wait to be accepted
constexpr std::size_t waitingRequests = 1024;
constexpr std::chrono::milliseconds pauseWithoutDescriptors{50};

/// What counts as one client: the address, or the network of 64 bits that one host has in IPv6.
std::string clientOf(const asio::ip::address& address) {
    if (address.is_v4()) {
        return address.to_string();
    }
    const asio::ip::address_v6 six = address.to_v6();
    if (six.is_v4_mapped()) {
        return asio::ip::make_address_v4(asio::ip::v4_mapped, six).to_string();
    }
    asio::ip::address_v6::bytes_type bytes = six.to_bytes();
    constexpr std::size_t networkBytes = 8;
    if (!six.is_loopback()) {
        std::fill(bytes.begin() + networkBytes, bytes.end(), std::uint8_t{0});
    }
    return asio::ip::address_v6(bytes).to_string();
}

bool isLoopback(const asio::ip::address& address) {
    return address.is_loopback() ||
           (address.is_v6() && address.to_v6().is_v4_mapped() &&
            asio::ip::make_address_v4(asio::ip::v4_mapped, address.to_v6()).is_loopback());
}

} // namespace

/// The sockets and threads behind a server. Each network thread has its own connections, so that
/// all that happens to one of them happens on one thread.
class HttpServer::Network {
public:
    Network(const Router& router, Size size);
    ~Network();

    Result<void> start(const ListenAddress& address, ApiToken token,
                       std::shared_ptr<const TlsContext> tls);
    void renew(ApiToken token, std::shared_ptr<const TlsContext> tls);
    void stop(Clock::time_point limit);
    void abandon(Clock::time_point limit);

    std::uint16_t port() const noexcept { return m_address.port; }
    const RequestDispatcher& dispatcher() const noexcept { return m_dispatcher; }
    const ConnectionShares& shares() const noexcept { return m_shares; }

private:
    /// One network thread and what it serves.
    struct Lane {
        asio::io_context io{1};
        asio::executor_work_guard<asio::io_context::executor_type> work{io.get_executor()};
        std::thread thread;
        std::map<const HttpConnection*, std::weak_ptr<HttpConnection>> connections; ///< its own
    };

    bool listen(const ListenAddress& address);
    bool listenAt(const tcp::endpoint& endpoint);
    Result<void> startThreads();
    static void run(Lane& lane);
    void waitForClient();
    void acceptClients();
    void pauseAccepting();
    void accept(int fd);
    void serve(int fd, const tcp::endpoint& endpoint);
    template <class Work> void onEachConnection(Work work);
    std::shared_ptr<const TlsContext> tls();

    const Size m_size;
    RequestDispatcher m_dispatcher;
    ConnectionShares m_shares;
    ListenAddress m_address{};
    int m_lowestDescriptor = 0; ///< of connections
    std::mutex m_mutex;
    std::shared_ptr<const TlsContext> m_tls; ///< guarded by the mutex; null: without TLS
    bool m_isRunning = false;
    ConnectionContext m_context;
    std::array<Lane, networkThreads> m_lanes; ///< with the connections
    tcp::acceptor m_acceptor{m_lanes.front().io};
    asio::steady_timer m_pause{m_lanes.front().io};
    std::size_t m_nextLane = 0;
    WorkerPool m_workers;
    WorkerPool m_quickWorkers; ///< last: the workers use the members above
};

HttpServer::Network::Network(const Router& router, Size size)
    : m_size(size),
      m_dispatcher(router), m_context{m_dispatcher, m_workers, m_quickWorkers, m_shares},
      m_workers(size.workers, waitingRequests), m_quickWorkers(size.quickWorkers, waitingRequests) {
}

HttpServer::Network::~Network() {
    stop(Clock::time_point::max());
}

Result<void> HttpServer::Network::start(const ListenAddress& address, ApiToken token,
                                        std::shared_ptr<const TlsContext> tls) {
    TraceScope trace(anchor);
    if (!listen(address)) {
        return refused("cannot listen on " + address.text() +
                       (address.port == 0 ? "" : ": is another agent running?"));
    }
    const DescriptorRoom room = DescriptorRoom::make(m_size.connections);
    m_shares.setMost(room.count);
    m_lowestDescriptor = room.lowest;
    renew(std::move(token), std::move(tls));
    waitForClient();
    if (const Result<void> started = startThreads(); !started) {
        return started;
    }
    trace.detail()("Listening at %s.", m_address.text().c_str());
    return {};
}

void HttpServer::Network::renew(ApiToken token, std::shared_ptr<const TlsContext> tls) {
    m_dispatcher.setGuard(RequestGuard(m_address, std::move(token), tls));
    const std::lock_guard guard(m_mutex);
    m_tls = std::move(tls);
}

std::shared_ptr<const TlsContext> HttpServer::Network::tls() {
    const std::lock_guard guard(m_mutex);
    return m_tls;
}

bool HttpServer::Network::listen(const ListenAddress& address) {
    Error error;
    tcp::resolver resolver(m_lanes.front().io);
    const auto found =
        resolver.resolve(address.host, std::to_string(address.port),
                         tcp::resolver::passive | tcp::resolver::numeric_service, error);
    for (const auto& entry : found) {
        if (listenAt(entry.endpoint())) {
            m_address = {address.host, m_acceptor.local_endpoint(error).port()};
            return true;
        }
    }
    return false;
}

// The library's own sockets are inherited by children. Two servers on one port would share its
// clients: an address in use is refused.
bool HttpServer::Network::listenAt(const tcp::endpoint& endpoint) {
    const int fd = socket(endpoint.protocol().family(), SOCK_STREAM | SOCK_CLOEXEC, IPPROTO_TCP);
    Error error;
    if (fd == -1 || m_acceptor.assign(endpoint.protocol(), fd, error)) {
        return false;
    }
    m_acceptor.set_option(tcp::acceptor::reuse_address(true), error);
    m_acceptor.non_blocking(true, error); // a client may be gone when it is accepted
    if (!m_acceptor.bind(endpoint, error) && !m_acceptor.listen(waitingClients, error)) {
        return true;
    }
    Error ignored;
    m_acceptor.close(ignored);
    return false;
}

Result<void> HttpServer::Network::startThreads() {
    m_isRunning = true;
    try {
        for (Lane& lane : m_lanes) {
            lane.thread = std::thread([&lane] { run(lane); });
        }
    } catch (const std::system_error& error) {
        stop(Clock::now());
        return refused(std::string("cannot start a thread: ") + error.what());
    }
    return {};
}

void HttpServer::Network::run(Lane& lane) {
    for (;;) {
        try {
            lane.io.run();
            return;
        } catch (const std::exception& exception) {
            TraceScope trace(anchor);
            trace.error()("A connection broke off: %s", exception.what());
        }
    }
}

void HttpServer::Network::waitForClient() {
    m_acceptor.async_wait(tcp::acceptor::wait_read, [this](const Error& error) {
        if (!error) {
            acceptClients();
        }
    });
}

/// Descriptors or memory are short, and the client still waits.
void HttpServer::Network::pauseAccepting() {
    m_pause.expires_after(pauseWithoutDescriptors);
    m_pause.async_wait([this](const Error& error) {
        if (!error) {
            waitForClient();
        }
    });
}

void HttpServer::Network::acceptClients() {
    for (;;) {
        // At once not for children: one that begins meanwhile would keep the client's connection
        // open.
        const int fd =
            accept4(m_acceptor.native_handle(), nullptr, nullptr, SOCK_CLOEXEC | SOCK_NONBLOCK);
        if (fd != -1) {
            accept(fd);
        } else if (errno == EAGAIN || errno == EWOULDBLOCK) {
            waitForClient();
            return;
        } else if (errno != EINTR && errno != ECONNABORTED) {
            pauseAccepting();
            return;
        }
    }
}

// The agent watches descriptors with select, which knows low numbers alone: connections leave
// those to it, however many there are.
void HttpServer::Network::accept(int fd) {
    tcp::endpoint endpoint;
    auto size = static_cast<socklen_t>(endpoint.capacity());
    const bool isThere = getpeername(fd, endpoint.data(), &size) == 0;
    const int moved = isThere ? fcntl(fd, F_DUPFD_CLOEXEC, m_lowestDescriptor) : -1;
    close(fd);
    if (moved == -1) {
        m_shares.countRefused();
        return;
    }
    endpoint.resize(size);
    try {
        serve(moved, endpoint);
    } catch (const std::exception& exception) {
        TraceScope trace(anchor);
        trace.error()("A connection broke off: %s", exception.what());
    }
}

void HttpServer::Network::serve(int fd, const tcp::endpoint& endpoint) {
    TraceScope trace(anchor);
    Lane& lane = m_lanes[m_nextLane++ % m_lanes.size()];
    tcp::socket socket(lane.io);
    Error error;
    if (socket.assign(endpoint.protocol(), fd, error)) {
        close(fd);
        return;
    }
    const std::shared_ptr<const TlsContext> certificate = tls();
    auto stream = ClientStream::make(std::move(socket), certificate);
    std::string client = clientOf(endpoint.address());
    if (!m_shares.take(client, isLoopback(endpoint.address()))) {
        trace.detail()("Connection from %s refused: %zu are open.", client.c_str(),
                       m_shares.count());
        return;
    }
    auto connection = std::make_shared<HttpConnection>(m_context, std::move(stream),
                                                       certificate != nullptr, std::move(client));
    asio::post(lane.io, [this, &lane, connection = std::move(connection)] {
        std::erase_if(lane.connections, [](const auto& entry) { return entry.second.expired(); });
        lane.connections[connection.get()] = connection;
        m_context.isStopping ? connection->close() : connection->start();
    });
}

/// Does something with each connection, on its own thread.
template <class Work> void HttpServer::Network::onEachConnection(Work work) {
    for (Lane& lane : m_lanes) {
        asio::post(lane.io, [&lane, work] {
            const auto connections = lane.connections;
            for (const auto& [key, weak] : connections) {
                if (const auto connection = weak.lock()) {
                    work(*connection);
                }
            }
        });
    }
}

void HttpServer::Network::stop(Clock::time_point limit) {
    TraceScope trace(anchor);
    if (!m_isRunning) {
        return;
    }
    m_isRunning = false;
    m_context.isStopping = true;
    asio::post(m_lanes.front().io, [this] {
        Error ignored;
        m_acceptor.close(ignored);
        m_pause.cancel();
    });
    onEachConnection([](HttpConnection& connection) { connection.stop(); });
    if (!m_shares.waitForNone(limit)) {
        trace.detail()("Clients are still being served.");
        m_dispatcher.close(limit);
    }
    for (Lane& lane : m_lanes) {
        lane.io.stop();
        if (lane.thread.joinable()) {
            lane.thread.join();
        }
    }
}

void HttpServer::Network::abandon(Clock::time_point limit) {
    onEachConnection([](HttpConnection& connection) { connection.cancel(); });
    m_dispatcher.close(limit);
}

HttpServer::HttpServer(const Router& router) : HttpServer(router, Size{}) {}

HttpServer::HttpServer(const Router& router, const Size& size)
    : m_network(std::make_unique<Network>(router, size)) {}

HttpServer::~HttpServer() = default;

Result<void> HttpServer::start(const ListenAddress& address, ApiToken token,
                               std::shared_ptr<const TlsContext> tls) {
    return m_network->start(address, std::move(token), std::move(tls));
}

void HttpServer::renew(ApiToken token, std::shared_ptr<const TlsContext> tls) {
    m_network->renew(std::move(token), std::move(tls));
}

std::uint16_t HttpServer::port() const noexcept {
    return m_network->port();
}

const RequestStatistics& HttpServer::statistics() const noexcept {
    return m_network->dispatcher().statistics();
}

std::size_t HttpServer::connections() const {
    return m_network->shares().count();
}

std::uint64_t HttpServer::refusedConnections() const {
    return m_network->shares().refused();
}

void HttpServer::stop(Clock::time_point limit) {
    m_network->stop(limit);
}

void HttpServer::abandon(Clock::time_point limit) {
    m_network->abandon(limit);
}

} // namespace zrm::host
