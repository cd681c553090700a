#include "host/api/HealthResource.h"

#include "host/http/RequestRefused.h"
#include "host/http/Router.h"

namespace zrm::host {

void HealthResource::addRoutes(Router& router) {
    router.add(
        "GET", "/healthz",
        [problem = m_problem](const HttpRequest&) {
            if (std::string reason = problem(); !reason.empty()) {
                throw RequestRefused(503, std::move(reason), "");
            }
            return HttpAnswer::json(R"({"status":"ok"})");
        },
        Router::PUBLIC, Router::QUICK);
}

} // namespace zrm::host
