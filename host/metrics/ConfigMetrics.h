#ifndef ZRM_HOST_CONFIG_METRICS_H
#define ZRM_HOST_CONFIG_METRICS_H

#include "host/metrics/MetricSource.h"

#include <atomic>

namespace zrm::host {

/// The result of the last change of the configuration file. Written by one thread, read by any.
struct ConfigReload {
    std::atomic<bool> isTakenOver{true};     ///< false: the current file cannot be used
    std::atomic<bool> hasRemovedMost{false}; ///< more than half of the situations are gone
};

/// Metrics on whether the agent's situations match its configuration file.
class ConfigMetrics : public MetricSource {
public:
    /// The reload must outlive the object.
    explicit ConfigMetrics(const ConfigReload& reload) : m_reload(reload) {}

    void collect(MetricText& text) override;

private:
    const ConfigReload& m_reload;
};

} // namespace zrm::host

#endif
