#ifndef ZRM_HOST_ACTIVE_SAMPLES_H
#define ZRM_HOST_ACTIVE_SAMPLES_H

#include <chrono>
#include <condition_variable>
#include <mutex>

/// Counts the samples under way, so that the end of the process can wait for them. Any thread.
class ActiveSamples {
public:
    /// One sample, while it lives; false when no more samples are begun.
    class Guard {
    public:
        explicit Guard(ActiveSamples& samples);
        ~Guard();
        Guard(const Guard&) = delete;
        Guard& operator=(const Guard&) = delete;
        explicit operator bool() const noexcept { return m_isCounted; }

    private:
        ActiveSamples& m_samples;
        bool m_isCounted;
    };

    /// Lets no more samples begin and waits for those of other threads, at most until the limit.
    void close(std::chrono::steady_clock::time_point limit);

private:
    std::mutex m_mutex;
    std::condition_variable m_ended;
    int m_count = 0;
    bool m_isClosed = false;
};

#endif
