#ifndef ZRM_HOST_HTTP_REQUEST_H
#define ZRM_HOST_HTTP_REQUEST_H

#include <map>
#include <stop_token>
#include <string>
#include <vector>

namespace zrm::host {

/// What a resource sees of a request, which has passed every rule of access by then.
struct HttpRequest {
    std::string method;                ///< GET stands for HEAD too
    std::string path;                  ///< as it was sent, without the query
    std::vector<std::string> captures; ///< the pattern's {names} in order, decoded, valid UTF-8
    std::multimap<std::string, std::string> query; ///< decoded, valid UTF-8
    std::string body;                              ///< empty, or sent as application/json
    std::string lastEventId;                       ///< header Last-Event-ID, empty without
    std::string accept;                            ///< header Accept, empty without
    /// Once it is requested, nobody needs the answer: long work ends early. A token without a state
    /// is never requested.
    std::stop_token cancelled;
};

} // namespace zrm::host

#endif
