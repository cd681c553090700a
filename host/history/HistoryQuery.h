#ifndef ZRM_HOST_HISTORY_QUERY_H
#define ZRM_HOST_HISTORY_QUERY_H

#include "host/history/Database.h"
#include "host/history/EventFilter.h"
#include "host/history/Statement.h"
#include "host/history/StoredEvent.h"

#include <cstdint>
#include <vector>

/// One query of the events of a history. Its work grows with what it gives, not with what the
/// history holds. Used once, by one thread. Throws DatabaseError.
class HistoryQuery {
public:
    /// Both references outlive the object.
    HistoryQuery(Database& database, const EventFilter& filter);

    std::vector<StoredEvent> run();

private:
    void narrowToTime();
    bool hasLabelFilter() const noexcept;
    std::vector<std::int64_t> labels();
    void walkAll();
    void walkLabels(const std::vector<std::int64_t>& labels);
    const char* direction() const noexcept { return m_filter.newestFirst ? " DESC" : ""; }
    bool full() const noexcept { return m_found.size() >= m_filter.limit; }
    void take(Statement& event);

    Database& m_database;
    const EventFilter& m_filter;
    std::int64_t m_first; ///< bounds of the ids, both included
    std::int64_t m_last;
    std::vector<StoredEvent> m_found;
};

#endif
