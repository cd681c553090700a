#ifndef ZRM_HOST_CONFIG_METRICS_H
#define ZRM_HOST_CONFIG_METRICS_H

#include "host/metrics/MetricSource.h"

#include <atomic>

/// Whether the agent's situations are those of its configuration file.
class ConfigMetrics : public MetricSource {
public:
    /// `isTakenOver`, which outlives the object, is false while the file cannot be used as it is.
    explicit ConfigMetrics(const std::atomic<bool>& isTakenOver) : m_isTakenOver(isTakenOver) {}

    void collect(MetricText& text) override;

private:
    const std::atomic<bool>& m_isTakenOver;
};

#endif
