#ifndef ZRM_HOST_REQUEST_PARSER_H
#define ZRM_HOST_REQUEST_PARSER_H

#include "host/http/Message.h"
#include "host/http/Refusal.h"
#include "host/http/RequestGuard.h"

#include <cstddef>
#include <memory>
#include <optional>
#include <string>
#include <string_view>

namespace zrm::host {

/// A request as received, before any rule has been applied.
struct IncomingRequest {
    HttpRequest request;  ///< without captures, query and body
    std::string rawQuery; ///< what follows '?', as sent
    RequestGuard::Headers headers;
    std::string contentType;
    bool hasBody = false;
    bool isChunked = false;            ///< the body is chunked
    bool isLast = false;               ///< the connection ends after the answer
    bool isHttp10 = false;             ///< the client does not support chunks
    bool waitsForContinue = false;     ///< the client sends the body when asked
    std::optional<std::size_t> length; ///< of the body, if the client states it
    std::optional<Refusal> refusal;    ///< why the request is refused; none: it is not
};

/// Reads one request as its bytes arrive. A head that another reader, such as a proxy, may
/// understand differently is refused, so that no body is read as a request. One thread.
class RequestParser {
public:
    /// The longest head without the empty line at its end, the longest target (path and query) and
    /// the longest header: bytes. A Range header may be longer, since nothing uses it.
    static constexpr std::size_t largestHead = 16 * 1024;
    static constexpr std::size_t largestTarget = 8000;
    static constexpr std::size_t largestLine = 8000;

    RequestParser();
    ~RequestParser();
    RequestParser(const RequestParser&) = delete;
    RequestParser& operator=(const RequestParser&) = delete;

    /// Reads further bytes and returns how many were consumed. The others are passed again with
    /// more after them. Stops after the head: what is passed then is the body. Consumes nothing
    /// once the request is complete or has a problem.
    std::size_t put(std::string_view bytes);

    /// True when at least one line has been read.
    bool hasBegun() const noexcept;
    /// True when the head has been read, or has a problem.
    bool isHeadDone() const noexcept;
    /// True when the request is complete.
    bool isDone() const noexcept;

    /// The head, once. A request that cannot be served has a problem; other parts of it may then be
    /// missing.
    IncomingRequest takeHead();

    /// Sets the largest accepted body in bytes. Called before the body.
    void limitBody(std::size_t most);
    /// Why the body is refused; none when it is not.
    const std::optional<Refusal>& bodyRefusal() const noexcept;
    /// The body, once, when the request is complete.
    std::string takeBody();

private:
    class Engine;
    std::unique_ptr<Engine> m_engine;
};

} // namespace zrm::host

#endif
