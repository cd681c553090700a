#ifndef ZRM_HOST_BACKTEST_H
#define ZRM_HOST_BACKTEST_H

#include "host/analysis/Reach.h"
#include "host/analysis/Replay.h"
#include "host/config/HostConfig.h"

#include <array>
#include <chrono>
#include <cstdint>
#include <functional>
#include <string>
#include <vector>

class TableManager;

namespace zrm {
class LogFile;
} // namespace zrm

namespace zrm::host {

/// Runs a situation over what logs hold between two times, by the logs' reports, without their
/// limit of rows. Holds the times of the entries that meet the conditions, and no rows. One
/// thread; it holds the logs still meanwhile (MonitoredLogs).
class Backtest {
public:
    static constexpr std::uint64_t mostEntries = 5'000'000; ///< read
    static constexpr std::size_t mostMatched = 1'000'000;
    static constexpr std::size_t mostTimes = 1000; ///< that the result names
    static constexpr std::chrono::seconds patience{30};

    struct Result {
        std::uint64_t entries = 0; ///< between the two times
        std::uint64_t matched = 0; ///< of these, met every condition
        std::uint64_t raised = 0;
        bool isTruncated = false;          ///< there are older entries that were not looked at
        Reach reach;                       ///< over all logs: back to `reached` every one was read
        std::vector<std::string> raisedAt; ///< the first times, 16 characters each
        std::string decision;              ///< one sentence
    };

    /// The table's manager outlives the object.
    Backtest(const SituationConfig& situation, TableManager& entries)
        : m_replay(situation, entries) {}

    /// Whether the table has given a request; nothing else may be called without.
    bool isOpen() const noexcept { return m_replay.isOpen(); }

    /// Reads the logs from one 16-character time to the other, ends included. Ends early, with a
    /// truncated result, when `isCancelled`.
    Result run(const std::vector<LogFile*>& logs, const std::string& from, const std::string& to,
               const std::function<bool()>& isCancelled);

private:
    using Stamp = std::array<char, 16>;
    struct Limits;

    void read(LogFile& log, const std::string& from, const std::string& to, Limits& limits,
              Result& result);
    void replay(Result& result);
    static void addReach(const LogFile& log, Reach reach, Result& result);
    std::string decisionOf(const Result& result) const;

    Replay m_replay;
    std::vector<Stamp> m_matched; ///< newest first within a log, logs one behind the other
};

} // namespace zrm::host

#endif
