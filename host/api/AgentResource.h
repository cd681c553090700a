#ifndef ZRM_HOST_AGENT_RESOURCE_H
#define ZRM_HOST_AGENT_RESOURCE_H

#include "host/http/Message.h"
#include "host/http/Router.h"

#include <cstdint>
#include <functional>
#include <string>
#include <utility>

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

/// `GET /healthz`: says whether the process serves HTTP and monitors logs. Needs no token.
class HealthResource : public Resource {
public:
    /// `problem` returns what keeps the agent from monitoring, or an empty text. Any thread.
    explicit HealthResource(std::function<std::string()> problem = [] { return std::string(); })
        : m_problem(std::move(problem)) {}

    void addRoutes(Router& router) override;

private:
    const std::function<std::string()> m_problem;
};

} // namespace zrm::host

#endif
