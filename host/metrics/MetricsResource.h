#ifndef ZRM_HOST_METRICS_RESOURCE_H
#define ZRM_HOST_METRICS_RESOURCE_H

#include "host/http/Router.h"
#include "host/metrics/MetricSources.h"

#include <memory>
#include <utility>
#include <vector>

namespace zrm::host {

/// `GET /metrics`: all metrics, for Prometheus.
class MetricsResource : public Resource {
public:
    /// Adds a source after those added before. Call before the server starts.
    void add(std::unique_ptr<MetricSource> source) { m_sources.push_back(std::move(source)); }

    void addRoutes(Router& router) override;

private:
    std::vector<std::unique_ptr<MetricSource>> m_sources;
};

} // namespace zrm::host

#endif
