#include "host/http/HealthResource.h"

#include "host/http/Router.h"

void HealthResource::addRoutes(Router& router) {
    router.add(
        "GET", "/healthz",
        [](const HttpRequest&) { return HttpAnswer::json(R"({"status":"ok"})"); }, Router::PUBLIC,
        Router::QUICK);
}
