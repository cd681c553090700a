#ifndef ZRM_HOST_SITUATION_METRICS_H
#define ZRM_HOST_SITUATION_METRICS_H

#include "host/metrics/MetricSource.h"

namespace zrm::host {

class SituationSet;

/// The situations: their states and what they have counted.
class SituationMetrics : public MetricSource {
public:
    /// `situations` outlives the object.
    explicit SituationMetrics(const SituationSet& situations) : m_situations(situations) {}

    void collect(MetricText& text) override;

private:
    const SituationSet& m_situations;
};

} // namespace zrm::host

#endif
