#ifndef ZRM_HOST_ENTRY_EVENTS_H
#define ZRM_HOST_ENTRY_EVENTS_H

#include "host/events/Event.h"

#include <cstddef>
#include <memory>
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

    std::vector<Collected> m_events;
    std::vector<char> m_rows;
    std::vector<std::shared_ptr<const EntryDetail>> m_details; ///< as many as events, or none
};

} // namespace zrm::host

#endif
