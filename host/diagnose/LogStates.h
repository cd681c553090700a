#ifndef ZRM_HOST_LOG_STATES_H
#define ZRM_HOST_LOG_STATES_H

#include "host/diagnose/LogLedgers.h"
#include "host/events/LogRhythm.h"

#include <chrono>
#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

/// What is known of one state of a log whose table has `quiet`.
struct LogState {
    enum class Kind : unsigned char { QUIET, DEAD, UNPARSED };
    static constexpr std::size_t kinds = 3; ///< how many there are
    /// The name of the situation that it raises.
    static const char* situationOf(Kind kind) noexcept;

    std::string log; ///< full path, UTF-8
    Kind kind;
    std::optional<bool> holds;     ///< none: this run cannot say yet
    std::chrono::seconds since{0}; ///< for how long it has held
    std::string text = {};         ///< what is the matter, if it holds
};

/// Watches how the ledgers of followed logs move: which log is quiet though it should have entries,
/// whose lines no longer fit their format, and which has had no file for a while. Time passes by
/// the steady clock, so that neither a clock that is set nor a suspended machine makes a log quiet.
/// One thread.
class LogStates {
public:
    using Clock = std::chrono::steady_clock;

    /// How long a log may be without a file that can be read; rotations take less.
    static constexpr std::chrono::seconds longestAbsence{30};
    /// Lines are judged together over this time.
    static constexpr std::chrono::minutes parsedWindow{10};
    /// Lines in a window, at least; fewer say little.
    static constexpr std::int64_t fewestLines = 20;

    /// Continues with rhythms that were learned earlier, by path.
    explicit LogStates(std::map<std::string, std::vector<SilentHour>> rhythms = {});

    /// Adds the warnings "quiet", "dead" and "unparsed", and sets the health of followed logs. To
    /// be called every few seconds. `wall` is in milliseconds since 1970.
    void judge(std::vector<LogLedgerView>& logs, Clock::time_point now, std::int64_t wall);

    /// The states of the logs whose tables have `quiet`, as judged last.
    const std::vector<LogState>& states() const noexcept { return m_states; }

    /// What was learned since the last call, to be kept.
    std::vector<LogSilence> takeLearned();

private:
    struct Watched {
        LogRhythm rhythm;
        std::optional<std::int64_t> lastEntry; ///< as its ledger has it
        Clock::time_point silentSince{};
        std::optional<Clock::time_point> deadSince;
        Clock::time_point windowBegin{};
        std::int64_t windowLines = 0; ///< of the ledger when the window began
        std::int64_t windowRows = 0;
        bool isUnparsed = false;
        bool isParsed = false; ///< most of the latest lines
        int unparsedPercent = 0;
        bool isSeen = true; ///< in this call
    };

    void judge(LogLedgerView& log, Clock::time_point now, std::int64_t local);
    void judgeFile(LogLedgerView& log, Watched& watched, Clock::time_point now);
    void judgeLines(LogLedgerView& log, Watched& watched, Clock::time_point now);
    void judgeSilence(LogLedgerView& log, Watched& watched, Clock::time_point now,
                      std::int64_t local);
    void addState(const LogLedgerView& log, LogState::Kind kind, std::optional<bool> holds,
                  std::chrono::seconds since = {}, const std::string& text = "");
    Watched& watched(const LogLedgerView& log, Clock::time_point now);

    std::map<std::string, std::vector<SilentHour>> m_kept; ///< of logs not seen yet
    std::map<std::string, Watched> m_logs;
    std::vector<LogState> m_states;
};

} // namespace zrm::host

#endif
