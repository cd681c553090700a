#ifndef ZRM_HOST_RESOURCE_H
#define ZRM_HOST_RESOURCE_H

namespace zrm::host {

class Router;

/// A group of routes that belong together. Made before the server starts, and outlives it.
class Resource {
public:
    virtual ~Resource() = default;

    /// Adds the routes, once. Their handlers are called on any thread, several at a time.
    virtual void addRoutes(Router& router) = 0;
};

} // namespace zrm::host

#endif
