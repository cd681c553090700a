#include "host/history/RhythmTable.h"

namespace zrm::host {

namespace {

constexpr std::int64_t hoursKept = (LogRhythm::weeksKept + 1) * 7 * 24;

} // namespace

RhythmTable::RhythmTable(Database& database)
    : m_keep(database, "INSERT OR REPLACE INTO rhythms (log, hour, silence)"
                       " VALUES (?, ?, ?)"),
      // Hours far ahead were noted by a clock that has since been corrected.
      m_forget(database, "DELETE FROM rhythms WHERE log = ? AND (hour < ? OR hour > ?)") {}

void RhythmTable::keep(std::int64_t log, const SilentHour& hour) {
    m_keep.bind(1, log).bind(2, hour.hour).bind(3, hour.silence).run();
    m_forget.bind(1, log).bind(2, hour.hour - hoursKept).bind(3, hour.hour + hoursKept).run();
}

std::map<std::string, std::vector<SilentHour>> RhythmTable::read(Database& database) {
    std::map<std::string, std::vector<SilentHour>> rhythms;
    Statement rows(database, "SELECT path, hour, silence FROM rhythms JOIN logs ON id = log"
                             " ORDER BY log, hour");
    while (rows.step()) {
        rhythms[std::string(rows.text(0))].push_back({rows.integer(1), rows.integer(2)});
    }
    return rhythms;
}

} // namespace zrm::host
