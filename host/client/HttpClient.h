#ifndef ZRM_HOST_HTTP_CLIENT_H
#define ZRM_HOST_HTTP_CLIENT_H

#include "host/config/HttpUrl.h"

#include <chrono>
#include <functional>
#include <memory>
#include <stop_token>
#include <string>
#include <string_view>
#include <vector>

namespace zrm::host {

/// How long the parts of one request may take. A byte now and then restarts only `silence`.
struct HttpLimits {
    using Duration = std::chrono::milliseconds;

    Duration connect{0}; ///< for the lookup, and again for the connection
    Duration head{0};    ///< until the answer's head is complete
    Duration whole{0};   ///< until the end of the answer; 0: no limit
    Duration silence{0}; ///< without any bytes; 0: no limit
};

struct HttpClientRequest {
    /// Gets a piece of the answer's body, which is not kept; false: the rest is not wanted.
    using Receiver = std::function<bool(int status, std::string_view piece)>;

    std::string method;
    std::string target;                    ///< sent unchanged: "/path?query"
    std::vector<std::string> headers = {}; ///< "Name: value", without line ends
    const std::string* body = nullptr;
    HttpLimits limits = {};
    Receiver receive = {};
};

/// The outcome of a request.
struct HttpClientAnswer {
    enum class Outcome {
        whole,         ///< the answer is there to its end
        partial,       ///< the head is there, not all of the body was taken
        stopped,       ///< giving up was requested
        late,          ///< a limit of time is over
        unknownName,   ///< the host has no address, or none is known yet
        unreachable,   ///< nothing accepts the connection
        untrusted,     ///< the server's certificate is not trusted for this host
        noTls,         ///< the server and this client do not agree on TLS
        noAuthorities, ///< the file of authorities cannot be used
        sendFailed,    ///< the connection ended while the request was sent
        brokenOff,     ///< the connection ended within the head
        notHttp,       ///< what came is not HTTP, or has a head that is too long
        failed,        ///< anything else
    };

    Outcome outcome = Outcome::failed;
    int status = 0;         ///< 0 until the whole head is there
    std::string retryAfter; ///< the header Retry-After
    std::string detail;     ///< of failed and unknownName, for people
};

/// Asks one server, one request at a time, over a connection that is kept while the server keeps
/// it. Head and time of an answer are bounded whatever the server sends; its body is the
/// receiver's to bound. Redirects are not followed and no proxy is used, whatever the environment
/// says. Certificates are always verified, TLS is at least 1.2. Used by one thread.
class HttpClient {
public:
    struct Options {
        HttpUrl server;          ///< its target is not used
        std::string caFile;      ///< trusted instead of the system's authorities; empty: those
        std::string authorities; ///< PEM, trusted in addition to the system's if there is no caFile
        std::string userAgent;
    };

    explicit HttpClient(Options options);
    ~HttpClient();
    HttpClient(const HttpClient&) = delete;
    HttpClient& operator=(const HttpClient&) = delete;

    /// Sends a request and waits for its answer. Returns soon after giving up is requested.
    /// Throws what the receiver throws, std::bad_alloc, and std::system_error when there can be no
    /// thread.
    HttpClientAnswer send(const HttpClientRequest& request, const std::stop_token& giveUp);

private:
    class Implementation;
    std::unique_ptr<Implementation> m_implementation;
};

} // namespace zrm::host

#endif
