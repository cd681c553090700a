#ifndef ZRM_HOST_HTTP_POST_H
#define ZRM_HOST_HTTP_POST_H

#include "host/config/SinkConfig.h"

#include <map>
#include <memory>
#include <stop_token>
#include <string>
#include <string_view>

namespace zrm::host {

/// Sends bodies to one URL by HTTP POST over a persistent connection. A request ends when its time
/// is up or a stop is requested, whatever the receiver does. The certificate of an https server is
/// always verified. Used by one thread.
class HttpPost {
public:
    using Headers = std::map<std::string, std::string>;

    /// Reads the options url, timeout, headers, headers_file and ca_file of a sink; `path` is added
    /// to the path of the URL. Has no effect outside the process.
    HttpPost(const SinkConfig& config, std::string_view path);
    ~HttpPost();
    HttpPost(const HttpPost&) = delete;
    HttpPost& operator=(const HttpPost&) = delete;

    /// Sends a JSON body with these headers in addition to those of the options. True when the
    /// receiver answers with a status from 200 to 299; otherwise error() says what went wrong. If
    /// the receiver has asked for a pause, nothing is sent until it is over.
    bool send(const std::string& body, const Headers& headers, const std::stop_token& giveUp);

    /// The body of the last answer, at most its first 64 kB.
    const std::string& answer() const noexcept;

    /// Why the last send failed.
    const std::string& error() const noexcept;

private:
    class Implementation;
    std::unique_ptr<Implementation> m_implementation;
};

} // namespace zrm::host

#endif
