#ifndef ZRM_HOST_LOG_METRICS_H
#define ZRM_HOST_LOG_METRICS_H

#include "host/metrics/MetricSource.h"

/// The monitored logs: what the agent tells of each in the Monitored Logs table.
class LogMetrics : public MetricSource {
public:
    void collect(MetricText& text) override;
};

#endif
