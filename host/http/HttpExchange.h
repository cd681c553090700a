#ifndef ZRM_HOST_HTTP_EXCHANGE_H
#define ZRM_HOST_HTTP_EXCHANGE_H

#include "host/http/ClientConnection.h"
#include "host/http/RequestDispatcher.h"

#include <cstddef>
#include <memory>
#include <stop_token>

/// Takes requests from connections and writes the answers: the one place that knows the library
/// which speaks HTTP. Any thread, one per connection.
class HttpExchange {
public:
    /// So many requests are served over one connection.
    static constexpr std::size_t requestsPerConnection = 1000;

    /// `dispatcher` outlives the object. Streams end when `stop` asks for it.
    HttpExchange(RequestDispatcher& dispatcher, std::stop_token stop);
    ~HttpExchange();
    HttpExchange(const HttpExchange&) = delete;
    HttpExchange& operator=(const HttpExchange&) = delete;

    /// Serves the one request whose head has been read; `isLast`: the client is told that the
    /// connection ends with it. True when the connection can be used for another one.
    bool serve(ClientConnection& connection, bool isLast);

    /// Writes a problem document in place of the answer to a request that was not read.
    void refuse(ClientConnection& connection, const Problem& problem);

private:
    class Engine;
    std::unique_ptr<Engine> m_engine;
};

#endif
