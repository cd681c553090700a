#include "host/situations/SituationSet.h"

#include "agent/TraceScope.h"

#include <algorithm>

namespace {

TRC1_Anchor anchor{"SituationSet.cpp"};

} // namespace

SituationSet::SituationSet(TableManager& entries, EventQueue& queue)
    : m_entries(entries), m_queue(queue) {}

void SituationSet::apply(const std::vector<SituationConfig>& configs) {
    TraceScope trace(anchor);
    std::erase_if(m_situations, [&](const auto& running) {
        const auto same = std::find(configs.begin(), configs.end(), running.second->config());
        if (same == configs.end()) {
            trace.detail()("Closing situation %s.", running.first.c_str());
        }
        return same == configs.end();
    });
    for (const SituationConfig& config : configs) {
        auto& situation = m_situations[config.name];
        if (situation == nullptr) {
            trace.detail()("Opening situation %s.", config.name.c_str());
            situation = std::make_unique<Situation>(config, m_entries, m_queue);
        }
    }
}

void SituationSet::close() {
    TraceScope trace(anchor);
    m_situations.clear();
}
