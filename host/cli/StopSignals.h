#ifndef ZRM_HOST_STOP_SIGNALS_H
#define ZRM_HOST_STOP_SIGNALS_H

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <functional>
#include <mutex>
#include <thread>

#include <signal.h>

namespace zrm::host {

/// While the object exists, Ctrl-C and SIGTERM request a stop instead of killing the process.
/// Create it before any other thread, so that all threads block the signals.
class StopSignals {
public:
    StopSignals();
    ~StopSignals();
    StopSignals(const StopSignals&) = delete;
    StopSignals& operator=(const StopSignals&) = delete;

    bool isStopped() const noexcept { return m_isStopped; }

    /// Waits for a signal or the timeout; true after a signal.
    bool wait(std::chrono::milliseconds time);

    /// Sets what to run, on a thread of the object, when a signal comes; runs at once if one has
    /// already come. An empty function removes the action, which does not run after this returns.
    void onStop(std::function<void()> action);

private:
    void watch();

    sigset_t m_signals{};
    sigset_t m_before{};
    std::atomic<bool> m_isStopped{false};
    std::atomic<bool> m_ends{false};
    std::mutex m_mutex; ///< guards the action
    std::condition_variable m_changed;
    std::function<void()> m_action;
    std::thread m_thread;
};

} // namespace zrm::host

#endif
