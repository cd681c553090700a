#ifndef ZRM_HOST_RATE_TABLE_H
#define ZRM_HOST_RATE_TABLE_H

#include "host/history/HistoryReader.h"
#include "host/history/Statement.h"

#include <cstdint>

namespace zrm::host {

/// Entries and events per minute and log, of the last day. Minutes are counted since 1970, UTC.
/// Used by one thread at a time. Throws DatabaseError.
class RateTable {
public:
    explicit RateTable(Database& database);

    /// Adds to the counts of a log, identified by its number in the table of logs.
    void add(std::int64_t minute, std::int64_t log, std::uint64_t entries, std::uint64_t events);

    /// Records that the minute was watched, and removes minutes more than a day away from it.
    void watched(std::int64_t minute);

    /// The counts from the step in which `from` lies to the one before `to`; times and step in
    /// milliseconds, the step a multiple of a minute.
    static Rates read(Database& database, std::int64_t from, std::int64_t to, std::int64_t step);

private:
    Statement m_add;
    Statement m_watched;
    Statement m_forgetMinutes;
    Statement m_forgetRates;
};

} // namespace zrm::host

#endif
