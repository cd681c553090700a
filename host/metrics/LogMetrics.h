#ifndef ZRM_HOST_LOG_METRICS_H
#define ZRM_HOST_LOG_METRICS_H

#include "host/metrics/MetricSource.h"

namespace zrm::host {

class LogWatch;

/// The monitored logs: what the agent tells of each in the Monitored Logs table.
class LogMetrics : public MetricSource {
public:
    /// `watch` outlives the object.
    explicit LogMetrics(const LogWatch& watch) : m_watch(watch) {}

    void collect(MetricText& text) override;

private:
    const LogWatch& m_watch;
};

} // namespace zrm::host

#endif
