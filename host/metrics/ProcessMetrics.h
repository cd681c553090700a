#ifndef ZRM_HOST_PROCESS_METRICS_H
#define ZRM_HOST_PROCESS_METRICS_H

#include "host/metrics/MetricSource.h"

namespace zrm::host {

/// Metrics of the process: version, start, processor time, memory, descriptors. What the system
/// does not report is left out.
class ProcessMetrics : public MetricSource {
public:
    /// The process counts as started when this object is created.
    ProcessMetrics();

    void collect(MetricText& text) override;

private:
    const double m_started; ///< seconds since 1970-01-01 UTC
};

} // namespace zrm::host

#endif
