#ifndef ZRM_HOST_RESOURCE_H
#define ZRM_HOST_RESOURCE_H

namespace zrm::host {

class Router;

/// A group of related routes. Created before the server starts; must outlive it.
class Resource {
public:
    virtual ~Resource() = default;

    /// Adds the routes, once. Their handlers are called on any thread, several at a time.
    virtual void addRoutes(Router& router) = 0;
};

} // namespace zrm::host

#endif
