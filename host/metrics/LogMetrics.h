#ifndef ZRM_HOST_LOG_METRICS_H
#define ZRM_HOST_LOG_METRICS_H

#include "host/metrics/MetricSource.h"

namespace zrm::host {

class LogWatch;

/// Metrics of the monitored logs, from the Monitored Logs table.
class LogMetrics : public MetricSource {
public:
    /// `watch` must outlive the object.
    explicit LogMetrics(const LogWatch& watch) : m_watch(watch) {}

    void collect(MetricText& text) override;

private:
    const LogWatch& m_watch;
};

} // namespace zrm::host

#endif
