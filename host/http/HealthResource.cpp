#include "host/http/HealthResource.h"

#include "host/http/RequestRefused.h"
#include "host/http/Router.h"

void HealthResource::addRoutes(Router& router) {
    router.add(
        "GET", "/healthz",
        [this](const HttpRequest&) {
            if (std::string problem = m_problem(); !problem.empty()) {
                throw RequestRefused(503, std::move(problem), "");
            }
            return HttpAnswer::json(R"({"status":"ok"})");
        },
        Router::PUBLIC, Router::QUICK);
}
