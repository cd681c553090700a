#include "host/cli/StopSignals.h"

#include <ctime>
#include <utility>

#include <pthread.h>

namespace zrm::host {

StopSignals::StopSignals() {
    sigemptyset(&m_signals);
    sigaddset(&m_signals, SIGINT);
    sigaddset(&m_signals, SIGTERM);
    pthread_sigmask(SIG_BLOCK, &m_signals, &m_before);
    m_thread = std::thread([this] { watch(); });
}

StopSignals::~StopSignals() {
    m_ends = true;
    m_thread.join();
    pthread_sigmask(SIG_SETMASK, &m_before, nullptr);
}

void StopSignals::watch() {
    constexpr timespec interval{0, 100'000'000};
    while (!m_ends) {
        if (sigtimedwait(&m_signals, nullptr, &interval) <= 0) {
            continue;
        }
        const std::lock_guard guard(m_mutex);
        m_isStopped = true;
        m_changed.notify_all();
        if (m_action) {
            m_action();
        }
    }
}

bool StopSignals::wait(std::chrono::milliseconds time) {
    std::unique_lock lock(m_mutex);
    return m_changed.wait_for(lock, time, [this] { return m_isStopped.load(); });
}

void StopSignals::onStop(std::function<void()> action) {
    const std::lock_guard guard(m_mutex);
    m_action = std::move(action);
    if (m_isStopped && m_action) {
        m_action();
    }
}

} // namespace zrm::host
