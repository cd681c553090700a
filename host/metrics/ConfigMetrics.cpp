#include "host/metrics/ConfigMetrics.h"

#include "host/metrics/MetricText.h"

namespace zrm::host {

void ConfigMetrics::collect(MetricText& text) {
    text.gauge("zrm_config_last_reload_successful",
               "0 when the last change of the configuration file was not loaded, otherwise 1.");
    text.add(m_reload.isTakenOver.load() ? 1.0 : 0.0);
    text.gauge("zrm_config_last_reload_removed_most_situations",
               "1 when the last change of the configuration file that was loaded removed more than "
               "half of its situations, otherwise 0.");
    text.add(m_reload.hasRemovedMost.load() ? 1.0 : 0.0);
}

} // namespace zrm::host
