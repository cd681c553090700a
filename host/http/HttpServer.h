#ifndef ZRM_HOST_HTTP_SERVER_H
#define ZRM_HOST_HTTP_SERVER_H

#include "host/base/ListenAddress.h"
#include "host/base/Result.h"
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

/// Serves the routes of a router over HTTP, with limits on everything a client can do. A few
/// threads do all network I/O; handlers run on workers. start, renew, stop and abandon are called
/// by one thread at a time.
class HttpServer {
public:
    using Clock = std::chrono::steady_clock;

    /// The number of connections served at a time, and of threads.
    struct Size {
        std::size_t connections = 2048; ///< fewer if the process may have only few descriptors
        std::size_t workers = 16;
        std::size_t quickWorkers = 2; ///< for routes on Router::QUICK
    };

    /// `router` must outlive the object.
    explicit HttpServer(const Router& router);
    HttpServer(const Router& router, const Size& size);
    HttpServer(const HttpServer&) = delete;
    HttpServer& operator=(const HttpServer&) = delete;
    /// Stops the server and waits for its threads.
    ~HttpServer();

    /// Starts listening and serving on its own threads, under TLS when there is a certificate.
    Result<void> start(const ListenAddress& address, ApiToken token,
                       std::shared_ptr<const TlsContext> tls = nullptr);

    /// From now on requests must carry this token, and new connections use this certificate, which
    /// is null if the server was started without one. Open connections stay open.
    void renew(ApiToken token, std::shared_ptr<const TlsContext> tls);

    /// The port at which it listens.
    std::uint16_t port() const noexcept;

    /// Statistics on the requests answered so far, and the number of open connections. Any thread.
    const RequestStatistics& statistics() const noexcept;
    std::size_t connections() const;
    /// Connections that were refused because the limit was reached.
    std::uint64_t refusedConnections() const;

    /// Stops serving: current requests are cancelled and answered first, streams end. Returns at
    /// the limit even if a client is still being served; no request is answered after that. May be
    /// called more than once; not on a thread of the server.
    void stop(Clock::time_point limit);

    /// For process exit on any thread, including the server's own: answers no more requests,
    /// cancels the current ones and waits for them, until the limit at the latest.
    void abandon(Clock::time_point limit);

private:
    class Network;
    std::unique_ptr<Network> m_network;
};

} // namespace zrm::host

#endif
