#ifndef ZRM_HOST_CONFIG_METRICS_H
#define ZRM_HOST_CONFIG_METRICS_H

#include "host/metrics/MetricSource.h"

#include <atomic>

namespace zrm::host {

/// How the last change of the configuration file went. Written by one thread, read by any.
struct ConfigReload {
    std::atomic<bool> isTakenOver{true};     ///< false: the file cannot be used as it is
    std::atomic<bool> hasRemovedMost{false}; ///< more than half of the file's situations
};

/// Whether the agent's situations are those of its configuration file.
class ConfigMetrics : public MetricSource {
public:
    /// The reload outlives the object.
    explicit ConfigMetrics(const ConfigReload& reload) : m_reload(reload) {}

    void collect(MetricText& text) override;

private:
    const ConfigReload& m_reload;
};

} // namespace zrm::host

#endif
