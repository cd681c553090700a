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

    /// From the beginning of a stop to the end of the process, even if something does not end.
    static constexpr std::chrono::milliseconds endLimit{8500};
    /// How long a thread may not move before it is reported as stuck.
    static constexpr std::chrono::seconds stillLimit{10};

    Watchdog() = default;
    Watchdog(const Watchdog&) = delete;
    Watchdog& operator=(const Watchdog&) = delete;

    /// Starts the thread; false if that fails. `requestStop` is called at most once, on that
    /// thread, for a signal that nothing else handles. Every signal must be blocked by then.
    bool start(std::function<void()> requestStop);

    /// A stop has begun: the process ends within endLimit. Only the first call counts. Any thread.
    void noteStopping() noexcept;

    /// What the main thread is doing, for the message of a forced end; a static text. Any thread.
    void noteStage(const char* stage) noexcept { m_stage.store(stage); }

    /// Which threads are stuck, as text without names, since anyone may see it; empty: none.
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
