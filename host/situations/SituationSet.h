#ifndef ZRM_HOST_SITUATION_SET_H
#define ZRM_HOST_SITUATION_SET_H

#include "host/config/HostConfig.h"
#include "host/situations/Situation.h"

#include <cstddef>
#include <map>
#include <memory>
#include <string>
#include <vector>

/// The running situations by name. Used by one thread.
class SituationSet {
public:
    /// The table's manager and the queue outlive the object.
    SituationSet(TableManager& entries, EventQueue& queue);
    SituationSet(const SituationSet&) = delete;
    SituationSet& operator=(const SituationSet&) = delete;

    /// Makes these the running situations: closes those that are gone, opens the new ones, and
    /// opens anew those that changed. One that is as it was goes on undisturbed, with the entry
    /// times that it has counted.
    void apply(const std::vector<SituationConfig>& configs);

    /// Closes all of them.
    void close();

    std::size_t size() const noexcept { return m_situations.size(); }

private:
    TableManager& m_entries;
    EventQueue& m_queue;
    std::map<std::string, std::unique_ptr<Situation>> m_situations;
};

#endif
