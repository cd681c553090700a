#ifndef ZRM_HOST_ROUTER_H
#define ZRM_HOST_ROUTER_H

#include "host/http/HttpAnswer.h"
#include "host/http/HttpRequest.h"

#include <functional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace zrm::host {

/// Which handler answers which method and path. Filled before the server starts; then any thread.
class Router {
public:
    /// Answers a request; may throw RequestRefused. Any other exception becomes a status 500.
    using Handler = std::function<HttpAnswer(const HttpRequest&)>;

    /// Who may ask.
    enum class Access {
        TOKEN,  ///< who carries the API token
        PUBLIC, ///< anyone that reaches this server
    };
    using enum Access;

    /// Where a handler runs.
    enum Lane {
        USUAL, ///< among all others; may take its time
        QUICK, ///< apart from them, so that no slow answer keeps it waiting; never waits itself
    };

    /// The route of a request.
    struct Match {
        const Handler* handler = nullptr; ///< null: none for this method, or for this path
        std::string pattern;              ///< empty when nothing is at this path
        Access access = TOKEN;
        Lane lane = USUAL;
        std::vector<std::string> captures; ///< as they stand in the path, not decoded
        std::string allow; ///< the methods of this path, as the header Allow names them
    };

    /// Adds a route. A pattern is a path; `{name}` stands for any one part of it that is not
    /// empty, and `*` at the end for any rest. Literal parts win over these. A route for GET
    /// answers HEAD too.
    void add(std::string method, const std::string& pattern, Handler handler, Access access = TOKEN,
             Lane lane = USUAL);

    /// Finds the route of a path as it was sent, without the query.
    Match match(std::string_view method, std::string_view path) const;

    /// Method and pattern of every route, in the order in which they were added.
    std::vector<std::pair<std::string, std::string>> routes() const;

private:
    struct Route {
        std::string method;
        std::string pattern;
        std::vector<std::string> parts;
        std::string rank; ///< smaller: more literal, from the left
        Handler handler;
        Access access;
        Lane lane;
    };

    std::vector<Route> m_routes;
};

} // namespace zrm::host

#endif
