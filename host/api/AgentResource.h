#ifndef ZRM_HOST_AGENT_RESOURCE_H
#define ZRM_HOST_AGENT_RESOURCE_H

#include "host/http/HttpAnswer.h"
#include "host/http/HttpRequest.h"
#include "host/http/Resource.h"

#include <cstdint>

namespace zrm::host {

class Delivery;
class LogWatch;

/// The agent as a whole: `GET /api/v1/status`, `PUT /api/v1/trace`, `GET /api/v1/columns` and
/// `POST /api/v1/refresh`.
class AgentResource : public Resource {
public:
    /// Both must outlive the object.
    AgentResource(Delivery& delivery, const LogWatch& watch);

    void addRoutes(Router& router) override;

private:
    HttpAnswer status(const HttpRequest& request);

    Delivery& m_delivery;
    const LogWatch& m_watch;
    const std::int64_t m_started; ///< milliseconds since 1970-01-01 UTC
};

} // namespace zrm::host

#endif
