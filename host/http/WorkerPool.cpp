#include "host/http/WorkerPool.h"

#include <system_error>
#include <utility>

namespace zrm::host {

WorkerPool::~WorkerPool() {
    {
        const std::lock_guard guard(m_mutex);
        m_isEnding = true;
    }
    m_changed.notify_all();
    for (std::thread& thread : m_threads) {
        thread.join();
    }
}

bool WorkerPool::submit(std::function<void()> work) {
    const std::lock_guard guard(m_mutex);
    if (m_waiting.size() >= m_mostWaiting) {
        return false;
    }
    if (m_idle <= m_waiting.size() && m_threads.size() < m_mostThreads && !makeThread() &&
        m_threads.empty()) {
        return false;
    }
    m_waiting.push_back(std::move(work));
    m_changed.notify_one();
    return true;
}

bool WorkerPool::makeThread() {
    try {
        m_threads.emplace_back(&WorkerPool::run, this);
        ++m_idle;
        return true;
    } catch (const std::system_error&) { // no thread can be started now
        return false;
    }
}

void WorkerPool::run() {
    std::unique_lock lock(m_mutex);
    for (;;) {
        m_changed.wait(lock, [&] { return m_isEnding || !m_waiting.empty(); });
        if (m_waiting.empty()) {
            return;
        }
        std::function<void()> work = std::move(m_waiting.front());
        m_waiting.pop_front();
        --m_idle;
        lock.unlock();
        work();
        work = nullptr; // destroy what it holds before the thread counts as idle
        lock.lock();
        ++m_idle;
    }
}

} // namespace zrm::host
