#ifndef ZRM_HOST_REQUEST_HEAD_H
#define ZRM_HOST_REQUEST_HEAD_H

#include "host/http/IncomingRequest.h"

#include <string_view>

/// Reads the head of a request to the letter: a head that another reader, for example a proxy on
/// the way, may understand otherwise is refused, so that no body is taken for a request.
/// Stateless.
class RequestHead {
public:
    /// The longest target (path and query) and the longest line of a header: bytes.
    static constexpr std::size_t largestTarget = 8000;
    static constexpr std::size_t largestLine = 8000;

    /// The request whose head this is, from its first line to the end of its last header, without
    /// the empty line. What cannot be served has a problem; the rest of it may be missing then.
    static IncomingRequest read(std::string_view head);
};

#endif
