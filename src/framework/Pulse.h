#ifndef ZRM_FRAMEWORK_PULSE_H
#define ZRM_FRAMEWORK_PULSE_H

#include <atomic>
#include <chrono>
#include <cstdint>

/// The heartbeat of one agent thread, which lets the framework detect a stuck thread. The thread
/// reports what it does and when it is idle; a counter that it keeps anyway can show progress in
/// long work. Costs the thread one store; the framework polls it from time to time.
class Pulse {
public:
    /// @param subject what the thread serves, for people; must outlive the object
    /// @param progress a number that changes while the thread works; null if there is none
    explicit Pulse(const char* subject, const std::atomic<std::int64_t>* progress = nullptr);
    ~Pulse();
    Pulse(const Pulse&) = delete;
    Pulse& operator=(const Pulse&) = delete;

    /// The thread starts or continues work. `doing` is a static text such as "reads the log".
    void work(const char* doing) noexcept {
        m_doing.store(doing, std::memory_order_relaxed);
        m_beats.store(m_beats.load(std::memory_order_relaxed) + 1, std::memory_order_release);
    }
    /// The thread is waiting for something to do and need not make progress.
    void rest() noexcept { work(nullptr); }

    class Framework; ///< the framework's watchdog; private to the framework

private:
    std::int64_t progress() const noexcept {
        return m_beats.load(std::memory_order_acquire) +
               (m_progress != nullptr ? m_progress->load(std::memory_order_relaxed) : 0);
    }

    const char* const m_subject;
    const std::atomic<std::int64_t>* const m_progress;
    std::atomic<const char*> m_doing{nullptr}; ///< null: the thread is idle
    std::atomic<std::int64_t> m_beats{0};
    // Owned by the framework, under its lock.
    Pulse* m_previous = nullptr;
    Pulse* m_next = nullptr;
    std::int64_t m_seen = -1; ///< progress at the last check
    std::chrono::steady_clock::time_point m_moved{};
};

#endif
