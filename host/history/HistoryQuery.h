#ifndef ZRM_HOST_HISTORY_QUERY_H
#define ZRM_HOST_HISTORY_QUERY_H

#include "host/events/Event.h"
#include "host/history/Database.h"
#include "host/history/EventText.h"
#include "host/history/HistoryReader.h"
#include "host/history/Statement.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <vector>

namespace zrm::host {

/// One query for events of a history. Its cost grows with the result, not with the history. A text
/// search, which examines every event that passes the rest of the filter, is limited in time. Used
/// once, by one thread. Throws DatabaseError.
class HistoryQuery {
public:
    using Clock = std::chrono::steady_clock;

    /// A text search stops after about this time; the caller can continue where it stopped.
    static constexpr std::chrono::milliseconds searchTime{250};

    /// Both references must outlive the object.
    HistoryQuery(Database& database, const EventFilter& filter,
                 std::chrono::milliseconds longest = searchTime);

    EventPage run();

private:
    void narrowToTime();
    bool hasLabelFilter() const noexcept;
    std::vector<std::int64_t> labels();
    void walkAll();
    void walkLabels(const std::vector<std::int64_t>& labels);
    const char* direction() const noexcept { return m_filter.newestFirst ? " DESC" : ""; }
    bool isDone() const noexcept;
    void look(const Statement& statement);
    bool isWanted(const EventRecord& event) const;

    Database& m_database;
    const EventFilter& m_filter;
    std::int64_t m_first; ///< bounds of the ids, both included
    std::int64_t m_last;
    const EventText m_text;
    const Clock::time_point m_searchLimit;
    std::size_t m_looked = 0; ///< number of events examined
    std::size_t m_bytes = 0;  ///< of the events found
    EventPage m_found;
};

} // namespace zrm::host

#endif
