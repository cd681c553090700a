#ifndef ZRM_HOST_DELIVERY_METRICS_H
#define ZRM_HOST_DELIVERY_METRICS_H

#include "host/metrics/MetricSource.h"

namespace zrm::host {

class Delivery;

/// Metrics of event delivery: the queue, the history, the sinks.
class DeliveryMetrics : public MetricSource {
public:
    /// `delivery` must outlive the object.
    explicit DeliveryMetrics(Delivery& delivery) : m_delivery(delivery) {}

    void collect(MetricText& text) override;

private:
    Delivery& m_delivery;
};

} // namespace zrm::host

#endif
