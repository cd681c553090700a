#ifndef ZRM_HOST_EXPLAINER_H
#define ZRM_HOST_EXPLAINER_H

#include "host/analysis/Explanation.h"
#include "host/analysis/KeptEntry.h"
#include "host/analysis/LogTail.h"
#include "host/analysis/Replay.h"
#include "host/base/Result.h"
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

/// Explains how a situation evaluates entries. Earlier entries of the log count towards the
/// thresholds, as far back as LogTail reads. Used by one thread, which keeps the logs from changing
/// in the meantime (MonitoredLogs).
class Explainer {
public:
    static constexpr std::size_t mostEntries = 1000;

    /// The entry of an event.
    struct EventEntry {
        std::uint64_t id;
        bool isOwn; ///< of this same situation: its row has the number of entries counted
        zrm_rmlogent_data_t row;
        std::optional<std::string> text = std::nullopt; ///< of the entry, if the event has it
        KeptEntry::Fields fields = {};                  ///< as far as the event has them
    };

    /// The table's manager must outlive the object. `isStopped`: the situation is not running.
    Explainer(SituationConfig situation, bool isStopped, TableManager& entries);

    /// Whether the table opened a request; if not, nothing else may be called.
    bool isOpen() const noexcept { return m_replay.isOpen(); }
    const RowLayout& layout() const { return m_replay.layout(); }

    /// Explains a line of a line-based log: its last occurrence in the log, or else as if it came
    /// next. A line longer than a monitor reads in one piece yields several explanations.
    Result<std::vector<Explanation>> line(LogFile& log, std::string_view line);

    /// The log's last entries, at most `mostEntries`, oldest first; or the last of this time
    /// (ENTRYTIME) and before, if one is given.
    Result<std::vector<Explanation>> last(LogFile& log, std::size_t number,
                                          const std::string& until = "");

    /// The entry of an event; the log is null when it is no longer monitored.
    Explanation event(LogFile* log, const EventEntry& entry);

    /// How far back the log was read for the latest explanation.
    const Reach& reach() const noexcept { return m_reach; }

private:
    /// An entry and the verdict on it.
    struct Seen;
    /// When an entry was written.
    struct Written {
        std::string stamp;
        std::optional<std::int64_t> instant; ///< of a followed log
        Replay::Values values = {};          ///< if the host judges
    };
    using Times = std::vector<Written>;

    Result<void> read(LogFile& log, const LogTail::Entry& entry, const std::string& until = "");
    Seen judge(Replay& replay, std::optional<std::string_view> line, zrm_rmlogent_data_t* row);
    static void countBefore(Replay& replay, const Times& before, const Written& last);
    bool usesFields() const;
    Explanation describe(const LogFile* log, Seen& seen);
    std::string reasonOf(const Replay::Verdict& verdict) const;
    void decide(Explanation& explanation, const Seen& seen) const;
    Result<std::vector<Explanation>> nextLine(LogFile& log, std::string_view line,
                                              const Times& before);

    const SituationConfig m_situation;
    const bool m_isStopped;
    TableManager& m_entries;
    Replay m_replay;
    std::optional<ConditionJudge> m_judge; ///< for every condition except the thresholds
    Reach m_reach;
};

} // namespace zrm::host

#endif
