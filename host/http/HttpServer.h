#ifndef ZRM_HOST_HTTP_SERVER_H
#define ZRM_HOST_HTTP_SERVER_H

#include "host/http/ApiToken.h"
#include "host/http/ListenAddress.h"
#include "host/http/SampleSource.h"

#include <chrono>
#include <cstdint>
#include <memory>
#include <string>

/// The HTTP API: `GET /healthz` and `POST /api/v1/tables/TABLE/sample`. start, stop and abandon
/// are called by one thread at a time.
class HttpServer {
public:
    /// `source` outlives the object.
    explicit HttpServer(SampleSource& source);
    HttpServer(const HttpServer&) = delete;
    HttpServer& operator=(const HttpServer&) = delete;
    /// Stops the server and waits for its threads.
    ~HttpServer();

    /// Begins to listen and to serve, on threads of its own. Returns what is wrong, empty when
    /// nothing is.
    std::string start(const ListenAddress& address, ApiToken token);

    /// The port at which it listens.
    std::uint16_t port() const noexcept;

    /// Ends the serving: requests under way are answered first. At the limit it returns although
    /// a client is still being served; no sample begins from then on. Any number of times; not on
    /// a thread of the server.
    void stop(std::chrono::steady_clock::time_point limit);

    /// For the end of the process on any thread, also on one of the server's: begins no further
    /// samples and waits for those under way, at most until the limit.
    void abandon(std::chrono::steady_clock::time_point limit);

private:
    class Implementation;
    std::unique_ptr<Implementation> m_implementation;
};

#endif
