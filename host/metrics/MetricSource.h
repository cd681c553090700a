#ifndef ZRM_HOST_METRIC_SOURCE_H
#define ZRM_HOST_METRIC_SOURCE_H

namespace zrm::host {

class MetricText;

/// A part of the host that provides metrics.
class MetricSource {
public:
    virtual ~MetricSource() = default;

    /// Adds the current metrics, each family once. Any thread, several at a time.
    virtual void collect(MetricText& text) = 0;
};

} // namespace zrm::host

#endif
