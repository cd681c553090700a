#ifndef ZRM_HOST_RHYTHM_TABLE_H
#define ZRM_HOST_RHYTHM_TABLE_H

#include "host/events/LogRhythm.h"
#include "host/history/Statement.h"

#include <cstdint>
#include <map>
#include <string>
#include <vector>

namespace zrm::host {

/// The longest silence of each log in each hour of the last weeks. Used by one thread at a time.
/// Throws DatabaseError.
class RhythmTable {
public:
    explicit RhythmTable(Database& database);

    /// Stores an hour of a log, identified by its number in the table of logs, and removes what the
    /// log has of hours long before it.
    void keep(std::int64_t log, const SilentHour& hour);

    /// All hours, by path.
    static std::map<std::string, std::vector<SilentHour>> read(Database& database);

private:
    Statement m_keep;
    Statement m_forget;
};

} // namespace zrm::host

#endif
