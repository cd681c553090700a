#ifndef ZRM_HOST_EXPLAINER_H
#define ZRM_HOST_EXPLAINER_H

#include "host/analysis/Explanation.h"
#include "host/analysis/Reach.h"
#include "host/analysis/Replay.h"
#include "host/config/HostConfig.h"
#include "logs/zrm_rmlogent_data.h"

#include <cstddef>
#include <cstdint>
#include <functional>
#include <memory>
#include <optional>
#include <string>
#include <string_view>
#include <vector>

class TableManager;

namespace zrm {
class LogFile;
} // namespace zrm

namespace zrm::host {

/// Explains what a situation makes of entries. The entries that a log holds before them are
/// counted for the thresholds, as far back as LogTail reads. One thread; it holds the logs still
/// meanwhile (MonitoredLogs).
class Explainer {
public:
    static constexpr std::size_t mostEntries = 1000;

    /// The entry of an event.
    struct EventEntry {
        std::uint64_t id;
        bool isOwn; ///< of this very situation: its row tells how many entries were counted
        zrm_rmlogent_data_t row;
    };

    /// The table's manager outlives the object. `isStopped`: the situation does not run.
    Explainer(SituationConfig situation, bool isStopped, TableManager& entries);

    /// Whether the table has given a request; nothing else may be called without.
    bool isOpen() const noexcept { return m_replay.isOpen(); }
    const RowLayout& layout() const { return m_replay.layout(); }

    /// A line of a log that has lines: where the log holds it last, or as if it came next. A line
    /// that is longer than a monitor reads in one piece has several.
    std::vector<Explanation> line(LogFile& log, std::string_view line);

    /// The log's last entries, at most `mostEntries`, oldest first.
    std::vector<Explanation> last(LogFile& log, std::size_t number);

    /// The entry of an event; the log is null when it is no longer monitored.
    Explanation event(LogFile* log, const EventEntry& entry);

    /// What was wrong with reading the log; empty when nothing was.
    const std::string& problem() const noexcept { return m_problem; }
    /// How far back the log was read for what was explained last.
    const Reach& reach() const noexcept { return m_reach; }

private:
    /// An entry and what was found when it was judged.
    struct Seen;
    using Stamps = std::vector<std::string>;

    std::string read(LogFile& log, const std::function<void(std::optional<std::string_view> line,
                                                            zrm_rmlogent_data_t* row)>& entry);
    Seen judge(Replay& replay, std::optional<std::string_view> line, zrm_rmlogent_data_t* row);
    Explanation describe(Seen& seen);
    void decide(Explanation& explanation, const Seen& seen) const;
    std::vector<Explanation> nextLine(LogFile& log, std::string_view line, const Stamps& before);

    const SituationConfig m_situation;
    const bool m_isStopped;
    TableManager& m_entries;
    Replay m_replay;
    std::optional<ConditionJudge> m_judge; ///< of every condition but the thresholds
    std::string m_problem;
    Reach m_reach;
};

} // namespace zrm::host

#endif
