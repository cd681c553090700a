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

/// A bounded pool of threads with a queue, for work that may block. A thread is started when there
/// is work and no idle thread, and then stays. Any thread.
class WorkerPool {
public:
    /// Limits the number of threads and of queued work items.
    WorkerPool(std::size_t mostThreads, std::size_t mostWaiting)
        : m_mostThreads(mostThreads), m_mostWaiting(mostWaiting) {}
    WorkerPool(const WorkerPool&) = delete;
    WorkerPool& operator=(const WorkerPool&) = delete;
    /// Waits until all work is done. Not on a thread of the pool.
    ~WorkerPool();

    /// Queues work, which must not throw; it runs in the order of submission. False when the queue
    /// is full, or when there is no thread and none can be started.
    bool submit(std::function<void()> work);

private:
    bool makeThread();
    void run();

    const std::size_t m_mostThreads;
    const std::size_t m_mostWaiting;
    std::mutex m_mutex; ///< guards the members below
    std::condition_variable m_changed;
    std::deque<std::function<void()>> m_waiting;
    std::size_t m_idle = 0; ///< idle threads
    bool m_isEnding = false;
    std::vector<std::thread> m_threads;
};

} // namespace zrm::host

#endif
