#ifndef ZRM_FRAMEWORK_PULSE_H
#define ZRM_FRAMEWORK_PULSE_H

#include <atomic>
#include <chrono>
#include <cstdint>

/// The sign of life of one thread of the agent, by which the framework notices one that no longer
/// moves. The thread reports what it works on and when it rests; a counter that it keeps anyway may
/// show that long work goes on. The thread pays a store for it; the framework looks now and then.
class Pulse {
public:
    /// @param subject what the thread serves, for people; lives longer than the object
    /// @param progress a number that changes while the thread works; null when there is none
    explicit Pulse(const char* subject, const std::atomic<std::int64_t>* progress = nullptr);
    ~Pulse();
    Pulse(const Pulse&) = delete;
    Pulse& operator=(const Pulse&) = delete;

    /// The thread begins to work, or goes on; `doing` is a static text: "reads the log".
    void work(const char* doing) noexcept {
        m_doing.store(doing, std::memory_order_relaxed);
        m_beats.store(m_beats.load(std::memory_order_relaxed) + 1, std::memory_order_release);
    }
    /// The thread waits for something to do: it need not move.
    void rest() noexcept { work(nullptr); }

    class Framework; ///< who looks: the framework's own matter

private:
    std::int64_t progress() const noexcept {
        return m_beats.load(std::memory_order_acquire) +
               (m_progress != nullptr ? m_progress->load(std::memory_order_relaxed) : 0);
    }

    const char* const m_subject;
    const std::atomic<std::int64_t>* const m_progress;
    std::atomic<const char*> m_doing{nullptr}; ///< null: the thread rests
    std::atomic<std::int64_t> m_beats{0};
    // The framework's, under its lock.
    Pulse* m_previous = nullptr;
    Pulse* m_next = nullptr;
    std::int64_t m_seen = -1; ///< progress at the last look
    std::chrono::steady_clock::time_point m_moved{};
};

#endif
