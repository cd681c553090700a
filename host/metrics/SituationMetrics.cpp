#include "host/metrics/SituationMetrics.h"

#include "host/metrics/MetricText.h"
#include "host/situations/SituationSet.h"

#include <cstdint>
#include <vector>

namespace zrm::host {

namespace {

/// A count of a situation.
struct Count {
    const char* name;
    const char* help;
    std::uint64_t SituationStatus::*value;
};

constexpr Count counts[] = {
    {"zrm_situation_offered_total", "Entries that were offered to the situation.",
     &SituationStatus::offered},
    {"zrm_situation_matched_total", "Entries that met every condition of the situation.",
     &SituationStatus::matched},
    {"zrm_situation_discarded_total", "Matching entries that the situation's thresholds rejected.",
     &SituationStatus::discarded},
    {"zrm_situation_raised_total", "Events that the situation raised.", &SituationStatus::raised},
};

/// A name may occur in both sources.
MetricText::Labels labelsOf(const SituationStatus& situation) {
    return {{"situation", situation.config.name},
            {"source", situation.source == SituationStatus::FILE ? "file" : "api"}};
}

} // namespace

void SituationMetrics::collect(MetricText& text) {
    const std::vector<SituationStatus> situations = m_situations.list();
    text.gauge("zrm_situation_running", "1 while the situation is running, otherwise 0.");
    for (const SituationStatus& situation : situations) {
        text.add(situation.state == SituationStatus::RUNNING ? 1.0 : 0.0, labelsOf(situation));
    }
    for (const Count& count : counts) {
        text.counter(count.name, count.help);
        for (const SituationStatus& situation : situations) {
            text.add(situation.*count.value, labelsOf(situation));
        }
    }
    constexpr double milliseconds = 1000.0;
    text.gauge("zrm_situation_last_raised_timestamp_seconds",
               "When the situation was last raised, in seconds since 1970.");
    for (const SituationStatus& situation : situations) {
        if (situation.lastRaised != 0) {
            text.add(static_cast<double>(situation.lastRaised) / milliseconds, labelsOf(situation));
        }
    }
}

} // namespace zrm::host
