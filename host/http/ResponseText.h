#ifndef ZRM_HOST_RESPONSE_TEXT_H
#define ZRM_HOST_RESPONSE_TEXT_H

#include "host/http/Message.h"

#include <cstdint>
#include <string>

namespace zrm::host {

/// Times in the form of HTTP headers, whatever the locale. Stateless.
class HttpDate {
public:
    /// Formats a time in seconds since 1970-01-01 UTC as in "Sun, 06 Nov 1994 08:49:37 GMT".
    static std::string text(std::int64_t seconds);

    static std::string now();
};

/// Answers as bytes sent over a connection. Stateless.
class ResponseText {
public:
    /// What an answer needs to know about the connection.
    struct Connection {
        bool isLast = false;   ///< it ends after this answer
        bool isHttp10 = false; ///< the client does not support chunks
        bool isTls = false;
    };

    /// Everything before the body. A stream is sent in chunks if the client supports them.
    static std::string head(const HttpAnswer& answer, const Connection& connection);

    /// A non-empty part of a chunked body.
    static std::string chunk(const std::string& text);
    /// The end of a chunked body.
    static std::string lastChunk();

    /// Asks a client that waits for "100 Continue" to send the body.
    static std::string askForBody();
};

} // namespace zrm::host

#endif
