#ifndef ZRM_HOST_ENTRY_EVENTS_H
#define ZRM_HOST_ENTRY_EVENTS_H

#include "host/events/Episode.h"
#include "host/events/Event.h"

#include <cstddef>
#include <memory>
#include <string>
#include <utility>
#include <vector>

namespace zrm {
class LogEntry;
} // namespace zrm

namespace zrm::host {

class EntryContext;

/// The events that one entry of a followed log has raised, collected on the log's thread until the
/// entry ends. Keeps its memory from entry to entry.
class EntryEvents {
public:
    /// Collects what the calling thread pushes into the queue; null: it goes into the queue at
    /// once.
    static inline constinit thread_local EntryEvents* ofThisThread = nullptr;

    /// Copies the row in; null: the event has none. All rows of an entry have the same size.
    void add(const std::shared_ptr<const SituationLabel>& situation, const char* row,
             std::size_t rowSize, const std::shared_ptr<const EventJudgement>& judgement = nullptr);
    /// What the entry has beside the rows: completes the events before they leave. `context` ends
    /// with the entry.
    void describe(LogEntry& entry, const EntryContext& context);
    void clear() noexcept {
        if (!empty()) {
            drop();
        }
    }

    /// The name of the log; its own thread sets it once.
    void setLog(std::string name) { m_log = std::move(name); }
    const std::string& log() const noexcept { return m_log; }

    /// An episode's share of this log has grown: it is handed over with the next position. Costs
    /// next to nothing until then, however often it grows.
    void note(const std::shared_ptr<GrowingShare>& share) {
        if (!share->isNoted.load(std::memory_order_relaxed)) {
            share->isNoted.store(true, std::memory_order_relaxed);
            m_shares.push_back(share);
        }
    }
    /// What has been noted, as it is now.
    std::vector<EpisodeShare> shares() const;
    /// The shares have been handed over, so that they are stored with the position.
    void forgetShares() noexcept;

    bool empty() const noexcept { return m_events.empty(); }
    std::size_t size() const noexcept { return m_events.size(); }
    const std::shared_ptr<const SituationLabel>& situation(std::size_t index) const noexcept {
        return m_events[index].situation;
    }
    const std::shared_ptr<const EventJudgement>& judgement(std::size_t index) const noexcept {
        return m_events[index].judgement;
    }
    /// Null: the event has no row.
    const char* row(std::size_t index) const noexcept {
        return m_events[index].hasRow ? m_rows.data() + m_events[index].row : nullptr;
    }
    /// Null until the entry was described.
    std::shared_ptr<const EntryDetail> detail(std::size_t index) const noexcept {
        return index < m_details.size() ? m_details[index] : nullptr;
    }

private:
    struct Collected {
        std::shared_ptr<const SituationLabel> situation;
        std::shared_ptr<const EventJudgement> judgement;
        std::size_t row = 0; ///< where its row begins
        bool hasRow = true;
    };

    void drop() noexcept;

    std::string m_log;
    std::vector<std::shared_ptr<GrowingShare>> m_shares; ///< noted; outlast the entry
    std::vector<Collected> m_events;
    std::vector<char> m_rows;
    std::vector<std::shared_ptr<const EntryDetail>> m_details; ///< as many as events, or none
};

} // namespace zrm::host

#endif
