#ifndef ZRM_HOST_WATCHDOG_H
#define ZRM_HOST_WATCHDOG_H

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <functional>
#include <mutex>
#include <string>
#include <thread>

namespace zrm::host {

/// Looks after the agent on a thread of its own, which waits for nothing of the agent's: that the
/// signals which end it are obeyed although the log manager's thread, which takes them, is stuck;
/// that an end which has begun comes to an end; and that the manager and the logs' threads move.
/// One per process.
class Watchdog {
public:
    using Clock = std::chrono::steady_clock;

    /// From the beginning of an end to the end of the process, whatever does not end by itself.
    static constexpr std::chrono::milliseconds endLimit{8500};
    /// How long a thread may stand still before it is called stuck.
    static constexpr std::chrono::seconds stillLimit{10};

    Watchdog() = default;
    Watchdog(const Watchdog&) = delete;
    Watchdog& operator=(const Watchdog&) = delete;

    /// Begins to look. `requestStop` is called at most once, on the watchdog's thread, for a signal
    /// that nobody takes. Every signal is blocked by then. False when there is no thread for it.
    bool start(std::function<void()> requestStop);

    /// The end has begun: within endLimit the process is gone. The first call counts. Any thread.
    void noteStopping() noexcept;

    /// What the main thread does now, for the message of a forced end; a static text. Any thread.
    void noteStage(const char* stage) noexcept { m_stage.store(stage); }

    /// Who stands still, for people: without names, which not everybody may see; empty: nobody.
    std::string problem() const;

private:
    void watch();
    void lookAtSignals();
    void lookAtPulses();
    void lookAtEnd() const;

    std::function<void()> m_requestStop;
    std::atomic<Clock::rep> m_stoppingSince{0}; ///< 0: no end has begun
    std::atomic<const char*> m_stage{"starting"};
    int m_looksWithStop = 0; ///< in a row, with a signal pending that is to end the agent
    int m_looksWithQuit = 0;
    bool m_hasAsked = false;

    mutable std::mutex m_mutex; ///< guards what follows
    std::string m_problem;
};

} // namespace zrm::host

#endif
