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

/// Ctrl-C (and SIGTERM) as a wish instead of a sudden end, as long as the object lives. Made
/// before other threads are, so that they block the signals, too.
class StopSignals {
public:
    StopSignals();
    ~StopSignals();
    StopSignals(const StopSignals&) = delete;
    StopSignals& operator=(const StopSignals&) = delete;

    bool isStopped() const noexcept { return m_isStopped; }

    /// Waits until the time is over or a signal has come; true when one has.
    bool wait(std::chrono::milliseconds time);

    /// What is done, on a thread of the object, when a signal comes; done at once when one has
    /// come already. An empty function: nothing any more; it does not run after this returns.
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
