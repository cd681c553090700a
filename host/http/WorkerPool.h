#ifndef ZRM_HOST_WORKER_POOL_H
#define ZRM_HOST_WORKER_POOL_H

#include <condition_variable>
#include <cstddef>
#include <deque>
#include <functional>
#include <mutex>
#include <thread>
#include <vector>

namespace zrm::host {

/// A bounded number of threads for work that may wait, and a queue before them. A thread is started
/// when there is work and none is free, and stays. Any thread.
class WorkerPool {
public:
    /// At most this many threads, and so much work that waits for one.
    WorkerPool(std::size_t mostThreads, std::size_t mostWaiting)
        : m_mostThreads(mostThreads), m_mostWaiting(mostWaiting) {}
    WorkerPool(const WorkerPool&) = delete;
    WorkerPool& operator=(const WorkerPool&) = delete;
    /// Waits until all work is done. Not on a thread of the pool.
    ~WorkerPool();

    /// Has the work done, which throws nothing, in the order of submission. False when too much
    /// waits already, or when there is no thread at all and none can be started.
    bool submit(std::function<void()> work);

private:
    bool makeThread();
    void run();

    const std::size_t m_mostThreads;
    const std::size_t m_mostWaiting;
    std::mutex m_mutex; ///< guards what follows
    std::condition_variable m_changed;
    std::deque<std::function<void()>> m_waiting;
    std::size_t m_idle = 0; ///< threads without work
    bool m_isEnding = false;
    std::vector<std::thread> m_threads;
};

} // namespace zrm::host

#endif
