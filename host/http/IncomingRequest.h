#ifndef ZRM_HOST_INCOMING_REQUEST_H
#define ZRM_HOST_INCOMING_REQUEST_H

#include "host/http/HttpRequest.h"
#include "host/http/Problem.h"
#include "host/http/RequestGuard.h"

#include <cstddef>
#include <optional>
#include <string>

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
    std::optional<Problem> problem;    ///< what makes the request unclear; none when nothing
};

} // namespace zrm::host

#endif
