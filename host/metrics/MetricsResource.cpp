#include "host/metrics/MetricsResource.h"

#include "base/TraceScope.h"
#include "host/http/QueryFields.h"
#include "host/http/Router.h"
#include "host/metrics/MetricText.h"

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"MetricsResource.cpp"};

} // namespace

void MetricsResource::addRoutes(Router& router) {
    router.add("GET", "/metrics", [this](const HttpRequest& request) {
        TraceScope trace(anchor);
        QueryFields(request).refuseUnknown();
        MetricText metrics;
        for (const auto& source : m_sources) {
            source->collect(metrics);
        }
        HttpAnswer answer;
        answer.contentType = "text/plain; version=0.0.4; charset=utf-8";
        answer.body = metrics.text();
        return answer;
    });
}

} // namespace zrm::host
