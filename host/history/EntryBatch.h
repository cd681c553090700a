#ifndef ZRM_HOST_ENTRY_BATCH_H
#define ZRM_HOST_ENTRY_BATCH_H

#include "host/events/PositionBook.h"
#include "host/history/EpisodeTable.h"
#include "host/history/EventBatch.h"

#include <cstddef>
#include <map>
#include <memory>
#include <span>
#include <string>
#include <vector>

namespace zrm::host {

/// What the history stores in one transaction: events up to the end of an entry, and the positions
/// behind the last entries of followed logs. Used by the writer's thread.
class EntryBatch {
public:
    /// Reserves memory for texts of this total size.
    void reserve(std::size_t bytes) { m_events->reserve(bytes); }

    /// Adds events from the queue as far as they end an entry, or all of them if none does. Returns
    /// their number. A null silencer holds nothing back.
    std::size_t add(std::span<const Event> events, const EventJson& format,
                    Silencer* silencer = nullptr);

    /// Whether the events end an entry, so that they may be stored.
    bool isWhole() const noexcept { return m_isWhole; }

    /// Ends the adding. Once.
    void seal() { m_events->seal(); }
    std::shared_ptr<const EventBatch> events() const noexcept { return m_events; }
    std::vector<PositionValue> positions() const;
    /// What the events say of episodes, in their order.
    const std::vector<EpisodeChange>& episodes() const noexcept { return m_episodes; }
    /// Whether an event ends an episode without an entry behind which that is stored.
    bool endsEpisodes() const noexcept { return m_endsEpisodes; }
    /// Adds what logs have judged behind their events. The end of an episode is stored with it:
    /// otherwise entries of the episode would be judged again, and begin another, if the agent was
    /// killed.
    void addReached(const std::vector<PositionValue>& reached);

private:
    std::shared_ptr<EventBatch> m_events = std::make_shared<EventBatch>();
    std::map<std::string, LogPosition> m_positions;            ///< by log
    std::map<std::string, std::vector<EpisodeShare>> m_shares; ///< by log, oldest first
    std::vector<EpisodeChange> m_episodes;
    bool m_endsEpisodes = false;
    bool m_isWhole = false;
};

} // namespace zrm::host

#endif
