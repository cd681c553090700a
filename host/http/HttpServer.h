#ifndef ZRM_HOST_HTTP_SERVER_H
#define ZRM_HOST_HTTP_SERVER_H

#include "host/base/ListenAddress.h"
#include "host/http/ApiToken.h"
#include "host/http/TlsContext.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <memory>
#include <string>

namespace zrm::host {

class RequestStatistics;
class Router;

/// Serves the routes of a router over HTTP, with limits on everything that a client can do. A few
/// threads do all reading and writing, handlers run on workers. start, renew, stop and abandon are
/// called by one thread at a time.
class HttpServer {
public:
    using Clock = std::chrono::steady_clock;

    /// How many may be served at a time, and how many threads do so.
    struct Size {
        std::size_t connections = 2048; ///< fewer where the process may have few descriptors
        std::size_t workers = 16;
        std::size_t quickWorkers = 2; ///< for routes on Router::QUICK
    };

    /// `router` outlives the object.
    explicit HttpServer(const Router& router);
    HttpServer(const Router& router, const Size& size);
    HttpServer(const HttpServer&) = delete;
    HttpServer& operator=(const HttpServer&) = delete;
    /// Stops the server and waits for its threads.
    ~HttpServer();

    /// Begins to listen and to serve, on threads of its own; under TLS when there is a certificate.
    /// Returns what is wrong, empty when nothing is.
    std::string start(const ListenAddress& address, ApiToken token,
                      std::shared_ptr<const TlsContext> tls = nullptr);

    /// From now on requests carry this token, and new connections use this certificate; null where
    /// the server was started without one. Connections that are open live on.
    void renew(ApiToken token, std::shared_ptr<const TlsContext> tls);

    /// The port at which it listens.
    std::uint16_t port() const noexcept;

    /// What was answered so far, and how many connections are open. Any thread.
    const RequestStatistics& statistics() const noexcept;
    std::size_t connections() const;
    /// Connections that were refused because the limit was reached.
    std::uint64_t refusedConnections() const;

    /// Ends the serving: requests under way are cancelled and answered first, streams end. At the
    /// limit it returns although a client is still being served; no request is answered from then
    /// on. Any number of times; not on a thread of the server.
    void stop(Clock::time_point limit);

    /// For the end of the process on any thread, also on one of the server's: answers no further
    /// requests, cancels those under way and waits for them, at most until the limit.
    void abandon(Clock::time_point limit);

private:
    class Network;
    std::unique_ptr<Network> m_network;
};

} // namespace zrm::host

#endif
