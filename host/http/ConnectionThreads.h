#ifndef ZRM_HOST_CONNECTION_THREADS_H
#define ZRM_HOST_CONNECTION_THREADS_H

#include <chrono>
#include <condition_variable>
#include <cstddef>
#include <functional>
#include <mutex>

/// One thread with a small stack for each connection, as many as are wanted up to a limit, so that
/// no client waits for another one. Each thread ends with its work. Any thread.
class ConnectionThreads {
public:
    using Clock = std::chrono::steady_clock;

    ConnectionThreads() = default;
    /// Waits for all threads.
    ~ConnectionThreads();
    ConnectionThreads(const ConnectionThreads&) = delete;
    ConnectionThreads& operator=(const ConnectionThreads&) = delete;

    /// Does the work on a thread of its own. False when that many threads run already, or the
    /// system has none; the work is then not touched.
    bool start(const std::function<void()>& work, std::size_t most);

    std::size_t count() const;

    /// Waits until no thread runs, at most until the limit; false at the limit.
    bool waitForAll(Clock::time_point limit);

private:
    struct Job;
    static void* run(void* job);
    void ended();

    mutable std::mutex m_mutex;
    std::condition_variable m_changed;
    std::size_t m_count = 0;
};

#endif
