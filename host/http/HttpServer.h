#ifndef ZRM_HOST_HTTP_SERVER_H
#define ZRM_HOST_HTTP_SERVER_H

#include "host/http/ApiToken.h"
#include "host/http/ConnectionThreads.h"
#include "host/http/HttpExchange.h"
#include "host/http/ListenAddress.h"
#include "host/http/ListenSocket.h"
#include "host/http/RequestDispatcher.h"
#include "host/http/Router.h"
#include "host/http/StopSignal.h"
#include "host/http/TlsContext.h"

#include <atomic>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <stop_token>
#include <string>
#include <thread>

/// Serves the routes of a router over HTTP: connections with their threads and limits. start, stop
/// and abandon are called by one thread at a time.
class HttpServer {
public:
    using Clock = std::chrono::steady_clock;

    /// `router` outlives the object.
    explicit HttpServer(const Router& router);
    HttpServer(const HttpServer&) = delete;
    HttpServer& operator=(const HttpServer&) = delete;
    /// Stops the server and waits for its threads.
    ~HttpServer();

    /// Begins to listen and to serve, on threads of its own; under TLS when there is a certificate.
    /// Returns what is wrong, empty when nothing is.
    std::string start(const ListenAddress& address, ApiToken token,
                      std::shared_ptr<const TlsContext> tls = nullptr);

    /// The port at which it listens.
    std::uint16_t port() const noexcept { return m_listen.port(); }

    /// What was answered so far, and how many connections are open. Any thread.
    const RequestStatistics& statistics() const noexcept { return m_dispatcher.statistics(); }
    std::size_t connections() const { return m_threads.count(); }
    /// Connections that found no place.
    std::uint64_t refusedConnections() const noexcept { return m_refused.load(); }

    /// Ends the serving: requests under way are answered first, streams end. At the limit it
    /// returns although a client is still being served; no request is answered from then on. Any
    /// number of times; not on a thread of the server.
    void stop(Clock::time_point limit);

    /// For the end of the process on any thread, also on one of the server's: answers no further
    /// requests and waits for those under way, at most until the limit.
    void abandon(Clock::time_point limit);

private:
    void acceptClients();
    void accept(int fd);
    std::unique_ptr<ClientSocket> socketFor(int fd) const;
    void serve(int fd);
    void serveRequests(ClientSocket& socket);
    std::chrono::milliseconds idleTime() const;

    RequestDispatcher m_dispatcher;
    StopSignal m_stop;
    std::stop_source m_streams; ///< asked to stop with the signal
    HttpExchange m_exchange;
    ListenSocket m_listen;
    std::shared_ptr<const TlsContext> m_tls; ///< null: without TLS
    std::size_t m_mostConnections = 0;
    int m_lowestDescriptor = 0; ///< of connections
    std::atomic<std::uint64_t> m_refused{0};
    std::thread m_acceptor;
    ConnectionThreads m_threads; ///< last: the threads use what stands above
};

#endif
