#ifndef ZRM_HOST_LOGS_RESOURCE_H
#define ZRM_HOST_LOGS_RESOURCE_H

#include "host/http/Message.h"
#include "host/http/Router.h"

namespace zrm::host {

class LogWatch;

/// `GET /api/v1/logs`: the current state of the monitored logs.
class LogsResource : public Resource {
public:
    /// `watch` must outlive the object.
    explicit LogsResource(const LogWatch& watch) : m_watch(watch) {}

    void addRoutes(Router& router) override;

private:
    HttpAnswer logs(const HttpRequest& request);

    const LogWatch& m_watch;
};

} // namespace zrm::host

#endif
