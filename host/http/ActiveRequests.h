#ifndef ZRM_HOST_ACTIVE_REQUESTS_H
#define ZRM_HOST_ACTIVE_REQUESTS_H

#include <chrono>
#include <condition_variable>
#include <mutex>

namespace zrm::host {

/// Counts the requests in progress, so that process exit can wait for them. Any thread.
class ActiveRequests {
public:
    /// One request while it exists; false when no more requests may begin.
    class Guard {
    public:
        explicit Guard(ActiveRequests& requests);
        ~Guard();
        Guard(const Guard&) = delete;
        Guard& operator=(const Guard&) = delete;
        explicit operator bool() const noexcept { return m_isCounted; }

    private:
        ActiveRequests& m_requests;
        bool m_isCounted;
    };

    /// Prevents new requests and waits for those of other threads, until the limit at the latest.
    void close(std::chrono::steady_clock::time_point limit);

private:
    std::mutex m_mutex;
    std::condition_variable m_ended;
    int m_count = 0;
    bool m_isClosed = false;
};

} // namespace zrm::host

#endif
