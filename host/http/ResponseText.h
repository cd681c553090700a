#ifndef ZRM_HOST_RESPONSE_TEXT_H
#define ZRM_HOST_RESPONSE_TEXT_H

#include "host/http/HttpAnswer.h"

#include <string>

namespace zrm::host {

/// Answers as they go over a connection. Stateless.
class ResponseText {
public:
    /// What the connection adds to an answer.
    struct Connection {
        bool isLast = false;   ///< it ends with this answer
        bool isHttp10 = false; ///< the client does not know chunks
        bool isTls = false;
    };

    /// Everything before the body. A stream is sent in chunks, to a client that knows them.
    static std::string head(const HttpAnswer& answer, const Connection& connection);

    /// A part of a body that is sent in chunks; not empty.
    static std::string chunk(const std::string& text);
    /// The end of such a body.
    static std::string lastChunk();

    /// Asks a client that waits for it to send the body.
    static std::string askForBody();
};

} // namespace zrm::host

#endif
