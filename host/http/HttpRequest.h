#ifndef ZRM_HOST_HTTP_REQUEST_H
#define ZRM_HOST_HTTP_REQUEST_H

#include <map>
#include <stop_token>
#include <string>
#include <vector>

namespace zrm::host {

/// A request as a resource sees it, after all access checks.
struct HttpRequest {
    std::string method;                ///< GET also for HEAD requests
    std::string path;                  ///< as sent, without the query
    std::vector<std::string> captures; ///< the pattern's {names} in order, decoded, valid UTF-8
    std::multimap<std::string, std::string> query; ///< decoded, valid UTF-8
    std::string body;                              ///< empty, or sent as application/json
    std::string lastEventId;                       ///< header Last-Event-ID; empty if absent
    std::string accept;                            ///< header Accept; empty if absent
    /// Requested once the answer is no longer needed, so that long work ends early. A token without
    /// a state is never requested.
    std::stop_token cancelled;
};

} // namespace zrm::host

#endif
