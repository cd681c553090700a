#ifndef ZRM_HOST_METRIC_SOURCE_H
#define ZRM_HOST_METRIC_SOURCE_H

namespace zrm::host {

class MetricText;

/// A part of the host that has metrics.
class MetricSource {
public:
    virtual ~MetricSource() = default;

    /// Adds the metrics as they are now, each family once. Any thread, several at a time.
    virtual void collect(MetricText& text) = 0;
};

} // namespace zrm::host

#endif
