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

/// A request as it came, before any rule was held against it.
struct IncomingRequest {
    HttpRequest request;  ///< without captures, query and body
    std::string rawQuery; ///< what stands behind '?', as it was sent
    RequestGuard::Headers headers;
    std::string contentType;
    bool hasBody = false;
    bool isChunked = false;            ///< the body comes in chunks
    bool isLast = false;               ///< the connection ends with the answer
    bool isHttp10 = false;             ///< the client does not know chunks
    bool waitsForContinue = false;     ///< the body comes when the client is asked for it
    std::optional<std::size_t> length; ///< of the body, where the client tells it
    std::optional<Refusal> refusal;    ///< what makes the request unclear; none when nothing
};

/// Reads one request as its bytes come in. A head that another reader, for example a proxy on the
/// way, may understand differently is refused, so that no body is taken for a request. One thread.
class RequestParser {
public:
    /// The longest head without the empty line at its end, the longest target (path and query) and
    /// the longest header: bytes. A Range header may be longer, since nothing looks at it.
    static constexpr std::size_t largestHead = 16 * 1024;
    static constexpr std::size_t largestTarget = 8000;
    static constexpr std::size_t largestLine = 8000;

    RequestParser();
    ~RequestParser();
    RequestParser(const RequestParser&) = delete;
    RequestParser& operator=(const RequestParser&) = delete;

    /// Reads on; the number of bytes that were taken. The others are given again, with more behind
    /// them. Stops behind the head: what is given then is the body. Nothing is taken once the
    /// request is whole, or has a problem.
    std::size_t put(std::string_view bytes);

    /// True when at least one line has been taken.
    bool hasBegun() const noexcept;
    /// True when the head has been read, or has a problem.
    bool isHeadDone() const noexcept;
    /// True when the request is whole.
    bool isDone() const noexcept;

    /// The head, once. What cannot be served has a problem; the rest of it may be missing then.
    IncomingRequest takeHead();

    /// Before the body: the largest one that is taken, in bytes.
    void limitBody(std::size_t most);
    /// Why the body is refused; none when it is not.
    const std::optional<Refusal>& bodyRefusal() const noexcept;
    /// The body, once, when the request is whole.
    std::string takeBody();

private:
    class Engine;
    std::unique_ptr<Engine> m_engine;
};

} // namespace zrm::host

#endif
