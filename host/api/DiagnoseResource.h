#ifndef ZRM_HOST_DIAGNOSE_RESOURCE_H
#define ZRM_HOST_DIAGNOSE_RESOURCE_H

#include "host/http/Message.h"
#include "host/http/Router.h"

#include <cstddef>

namespace zrm::host {

/// `POST /api/v1/try`: tries a format on lines. `POST /api/v1/check`: judges a log configuration.
class DiagnoseResource : public Resource {
public:
    static constexpr std::size_t mostValues = 50000;      ///< pieces of lines times directives
    static constexpr std::size_t mostConfigLines = 10000; ///< of a configuration

    void addRoutes(Router& router) override;

private:
    static HttpAnswer tryFormat(const HttpRequest& request);
    static HttpAnswer checkConfig(const HttpRequest& request);
};

} // namespace zrm::host

#endif
