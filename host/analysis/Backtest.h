#ifndef ZRM_HOST_BACKTEST_H
#define ZRM_HOST_BACKTEST_H

#include "host/analysis/LogTail.h"
#include "host/analysis/Replay.h"
#include "host/analysis/TextPool.h"
#include "host/config/HostConfig.h"

#include <array>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <vector>

class TableManager;

namespace zrm {
class EntryReader;
class LogFile;
} // namespace zrm

namespace zrm::host {

/// Runs a situation over the contents of logs between two times: over all generations of a followed
/// log (FollowedReport), and with the reports of the others, without their row limit. Keeps the
/// times of matching entries but no rows. Used by one thread, which keeps the logs from changing in
/// the meantime (MonitoredLogs).
class Backtest {
public:
    static constexpr std::uint64_t mostEntries = 5'000'000; ///< read
    static constexpr std::size_t mostMatched = 1'000'000;
    static constexpr std::size_t mostTimes = 1000;    ///< listed in the result
    static constexpr std::size_t mostEpisodes = 1000; ///< listed in the result
    /// Bytes of the values that make groups, all together.
    static constexpr std::size_t mostValues = std::size_t{128} * 1024 * 1024;
    static constexpr std::chrono::seconds patience{30};

    /// An episode that would have been. Times are entries' own, in seconds since 1970.
    struct FoundEpisode {
        std::int64_t first = 0;
        std::int64_t last = 0;
        std::uint64_t count = 0;
        std::vector<GroupValue> group; ///< empty: the situation has no groups
        bool isOver = true;            ///< false: it would last now
    };

    struct Result {
        std::uint64_t entries = 0; ///< between the two times
        std::uint64_t matched = 0; ///< of these, those that met every condition
        std::uint64_t raised = 0;
        bool isTruncated = false;          ///< there are older entries that were not read
        Reach reach;                       ///< over all logs: each was read back to `reached`
        std::vector<std::string> raisedAt; ///< the first times, 16 characters each
        std::uint64_t episodes = 0;
        std::vector<FoundEpisode> found; ///< those that began first
        std::uint64_t droppedGroups = 0; ///< that made room for others while they counted
        std::string decision;            ///< one sentence
    };

    /// The table's manager must outlive the object.
    Backtest(const SituationConfig& situation, TableManager& entries)
        : m_replay(situation, entries), m_resolveAfter(situation.judgement.resolveAfter),
          m_then(situation.judgement.then), m_absent(situation.judgement.absentText) {}

    /// Whether the table opened a request; if not, nothing else may be called.
    bool isOpen() const noexcept { return m_replay.isOpen(); }

    /// Reads the logs between two 16-character times, both included. Ends early with a truncated
    /// result once `isCancelled` returns true.
    Result run(const std::vector<LogFile*>& logs, const std::string& from, const std::string& to,
               const std::function<bool()>& isCancelled);

private:
    using Stamp = std::array<char, 16>;
    struct Limits;
    class Entries;
    /// An entry that met every condition.
    struct Matched {
        Stamp time;
        Stamp order;                         ///< time by which entries of all logs are ordered
        std::optional<std::int64_t> instant; ///< of a followed log
        // Of m_texts, if the host judges.
        TextPool::Number group = 0;
        TextPool::Number distinct = 0;
        TextPool::Number log = 0;
        bool mayRaise = true;
    };

    void read(LogFile& log, const std::string& from, const std::string& to, Limits& limits,
              Result& result);
    /// Judges the entries of a report.
    template <typename Report>
    void judge(const LogFile& log, Report& report, Limits& limits, Result& result);
    void readFollowed(const LogFile& log, EntryReader& entries, const std::string& from,
                      const std::string& to, Limits& limits, Result& result);
    void add(const zrm_rmlogent_data_t& row, std::optional<std::int64_t> instant);
    void addEpisodes(const std::vector<EndedEpisode>& episodes, bool areOver, Result& result);
    void keepOrder(std::size_t first);
    Replay::Verdict count(const Matched& matched);
    void replay(const std::string& from, const std::string& to, Result& result);
    void beginAbsence(const std::string& from, const Result& result);
    void endAbsence(const std::string& to);
    void addAbsences(Result& result);
    void listEpisodes(Result& result);
    static void addReach(const LogFile& log, Reach reach, Result& result);
    std::string decisionOf(const Result& result) const;
    std::string absenceDecision(const Result& result) const;

    Replay m_replay;
    TextPool m_texts;
    std::int64_t m_resolveAfter;
    std::string m_then;             ///< of JudgementConfig
    std::string m_absent;           ///< as the operator has written it; empty: none
    std::vector<Matched> m_matched; ///< newest first within a log, one log after another
};

} // namespace zrm::host

#endif
