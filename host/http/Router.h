#ifndef ZRM_HOST_ROUTER_H
#define ZRM_HOST_ROUTER_H

#include "host/http/Message.h"

#include <functional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace zrm::host {

/// Maps methods and paths to handlers. Filled before the server starts; after that, any thread.
class Router {
public:
    /// Answers a request; may throw RequestRefused. Any other exception becomes a status 500.
    using Handler = std::function<HttpAnswer(const HttpRequest&)>;

    /// Who may send the request.
    enum class Access {
        TOKEN,  ///< clients with the API token
        PUBLIC, ///< anyone who can reach this server
    };
    using enum Access;

    /// Where a handler runs.
    enum class Lane {
        USUAL, ///< with all others; may be slow
        QUICK, ///< separate, so that slow answers cannot delay it; never waits itself
    };
    using enum Lane;

    /// The route of a request.
    struct Match {
        const Handler* handler = nullptr; ///< null: none for this method, or for this path
        std::string pattern;              ///< empty when no route has this path
        Access access = TOKEN;
        Lane lane = USUAL;
        std::vector<std::string> captures; ///< as in the path, not decoded
        std::string allow;                 ///< the methods of this path, as in the Allow header
    };

    /// Adds a route. A pattern is a path in which `{name}` matches one non-empty segment and a
    /// final `*` matches any rest. Literal segments take precedence. A route for GET also answers
    /// HEAD.
    void add(std::string method, const std::string& pattern, Handler handler, Access access = TOKEN,
             Lane lane = USUAL);

    /// Finds the route for a path as sent, without the query.
    Match match(std::string_view method, std::string_view path) const;

    /// Method and pattern of every route, in the order of addition.
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

/// A group of related routes. Created before the server starts; must outlive it.
class Resource {
public:
    virtual ~Resource() = default;

    /// Adds the routes, once. Their handlers are called on any thread, several at a time.
    virtual void addRoutes(Router& router) = 0;
};

} // namespace zrm::host

#endif
