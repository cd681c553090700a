#ifndef ZRM_HOST_CONSOLE_RESOURCE_H
#define ZRM_HOST_CONSOLE_RESOURCE_H

#include "host/http/Resource.h"

namespace zrm::host {

/// The web console: `GET /` is its page, `GET /console/FILE` the files that the page is made of.
/// None of them holds anything of this machine, so they need no token; the page asks for it.
class ConsoleResource : public Resource {
public:
    void addRoutes(Router& router) override;
};

} // namespace zrm::host

#endif
