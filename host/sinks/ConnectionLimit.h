#ifndef ZRM_HOST_CONNECTION_LIMIT_H
#define ZRM_HOST_CONNECTION_LIMIT_H

#include <chrono>
#include <condition_variable>
#include <mutex>
#include <stop_token>
#include <thread>

/// Shuts a connection down when a time is over or giving up is requested, so that whatever waits
/// for it in another library returns at once. Watches from its construction to its destruction;
/// the socket is told when it is made.
class ConnectionLimit {
public:
    using Clock = std::chrono::steady_clock;

    ConnectionLimit(Clock::time_point end, std::stop_token giveUp);
    ~ConnectionLimit();
    ConnectionLimit(const ConnectionLimit&) = delete;
    ConnectionLimit& operator=(const ConnectionLimit&) = delete;

    /// The socket that is watched from now on, connected already or not; -1 for none. It stays
    /// open for the time in which it is watched, also when its owner closes it.
    void watch(int socket);

    Clock::time_point end() const noexcept { return m_end; }

    /// True when the end has come.
    bool hasEnded() const;

private:
    void run(const std::stop_token& done);

    const Clock::time_point m_end;
    const std::stop_token m_giveUp;
    mutable std::mutex m_mutex;
    std::condition_variable_any m_changed;
    int m_socket = -1; ///< a duplicate: its number is not given to another file meanwhile
    bool m_hasEnded = false;
    std::jthread m_thread;
};

#endif
