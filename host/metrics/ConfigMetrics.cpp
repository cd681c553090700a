#include "host/metrics/ConfigMetrics.h"

#include "host/metrics/MetricText.h"

void ConfigMetrics::collect(MetricText& text) {
    text.gauge("zrm_config_last_reload_successful",
               "0 when the last change of the configuration file was not taken over, else 1.");
    text.add(m_isTakenOver.load() ? 1.0 : 0.0);
}
