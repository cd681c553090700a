#ifndef ZRM_HOST_SITUATION_METRICS_H
#define ZRM_HOST_SITUATION_METRICS_H

#include "host/metrics/MetricSource.h"

namespace zrm::host {

class SituationSet;

/// Metrics of the situations: their states and counts.
class SituationMetrics : public MetricSource {
public:
    /// `situations` must outlive the object.
    explicit SituationMetrics(const SituationSet& situations) : m_situations(situations) {}

    void collect(MetricText& text) override;

private:
    const SituationSet& m_situations;
};

} // namespace zrm::host

#endif
