#include "host/events/ContextDemand.h"

#include <algorithm>
#include <mutex>
#include <utility>
#include <vector>

namespace zrm::host {

namespace {

struct Demand {
    std::optional<std::string> log;
    std::size_t entries;
    bool operator==(const Demand&) const = default;
};

struct Demands {
    std::mutex mutex;
    std::vector<Demand> all;
};

/// Never destroyed: log threads may still run while the process exits.
Demands& demands() {
    static auto* const theDemands = new Demands;
    return *theDemands;
}

} // namespace

ContextDemand::Hold::Hold(std::optional<std::string> log, std::size_t entries)
    : m_log(std::move(log)), m_entries(entries) {
    if (m_entries > 0) {
        const std::lock_guard guard(demands().mutex);
        demands().all.push_back({m_log, m_entries});
        ++m_generation;
    }
}

ContextDemand::Hold::~Hold() {
    if (m_entries > 0) {
        const std::lock_guard guard(demands().mutex);
        std::vector<Demand>& all = demands().all;
        all.erase(std::find(all.begin(), all.end(), Demand{m_log, m_entries}));
        ++m_generation;
    }
}

std::size_t ContextDemand::of(std::string_view log) {
    const std::lock_guard guard(demands().mutex);
    std::size_t most = 0;
    for (const Demand& demand : demands().all) {
        most = !demand.log || *demand.log == log ? std::max(most, demand.entries) : most;
    }
    return most;
}

} // namespace zrm::host
