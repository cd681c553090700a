#ifndef ZRM_HOST_HEALTH_RESOURCE_H
#define ZRM_HOST_HEALTH_RESOURCE_H

#include "host/http/Resource.h"

#include <functional>
#include <string>
#include <utility>

namespace zrm::host {

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
