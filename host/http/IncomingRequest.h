#ifndef ZRM_HOST_INCOMING_REQUEST_H
#define ZRM_HOST_INCOMING_REQUEST_H

#include "host/http/HttpRequest.h"
#include "host/http/Problem.h"
#include "host/http/RequestGuard.h"

#include <cstddef>
#include <functional>
#include <optional>
#include <string>

/// A request as it came, before any rule was held against it.
struct IncomingRequest {
    HttpRequest request;  ///< without captures, query and body
    std::string rawQuery; ///< what stands behind '?', as it was sent
    RequestGuard::Headers headers;
    std::string contentType;
    bool hasBody = false;
    bool isChunked = false;            ///< the body comes in chunks
    bool isLast = false;               ///< the connection ends with the answer
    std::optional<std::size_t> length; ///< of the body, where the client tells it
    std::optional<Problem> problem;    ///< what makes the request unclear; none when nothing
};

/// Reads the body of a request, at most so many bytes. Throws RequestRefused when it is longer, or
/// does not come whole.
using BodyReader = std::function<std::string(std::size_t most)>;

#endif
