#ifndef ZRM_HOST_CONSOLE_RESOURCE_H
#define ZRM_HOST_CONSOLE_RESOURCE_H

#include "host/http/Resource.h"

namespace zrm::host {

/// The web console: `GET /` is its page, `GET /console/FILE` are the files that the page uses. They
/// contain nothing about this machine and need no token; the page asks the user for it.
class ConsoleResource : public Resource {
public:
    void addRoutes(Router& router) override;
};

} // namespace zrm::host

#endif
