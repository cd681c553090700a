#include "host/http/ConnectionThreads.h"

#include <cerrno>
#include <memory>
#include <new>

#include <pthread.h>

namespace {

/// Enough for parsing a request and for whatever a handler does: no recursion depends on input.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr std::size_t stackSize = 4 * 1024 * 1024; // instrumented frames are larger
#else
constexpr std::size_t stackSize = 1024 * 1024;
#endif

} // namespace

struct ConnectionThreads::Job {
    ConnectionThreads& threads;
    std::function<void()> work;
};

ConnectionThreads::~ConnectionThreads() {
    waitForAll(Clock::time_point::max());
}

void* ConnectionThreads::run(void* pointer) {
    std::unique_ptr<Job> job(static_cast<Job*>(pointer));
    ConnectionThreads& threads = job->threads;
    job->work();
    job.reset(); // whatever the work holds is gone before the thread counts as ended
    threads.ended();
    return nullptr;
}

void ConnectionThreads::ended() {
    const std::lock_guard guard(m_mutex); // the object may be gone as soon as it is released
    --m_count;
    m_changed.notify_all();
}

bool ConnectionThreads::start(const std::function<void()>& work, std::size_t most) {
    {
        const std::lock_guard guard(m_mutex);
        if (m_count >= most) {
            return false;
        }
        ++m_count;
    }
    std::unique_ptr<Job> job(new (std::nothrow) Job{*this, work});
    pthread_attr_t attributes;
    pthread_attr_init(&attributes);
    pthread_attr_setstacksize(&attributes, stackSize);
    pthread_attr_setdetachstate(&attributes, PTHREAD_CREATE_DETACHED);
    pthread_t thread{};
    const int result =
        job == nullptr ? ENOMEM : pthread_create(&thread, &attributes, run, job.get());
    pthread_attr_destroy(&attributes);
    if (result != 0) {
        ended();
        return false;
    }
    static_cast<void>(job.release()); // the thread's now
    return true;
}

std::size_t ConnectionThreads::count() const {
    const std::lock_guard guard(m_mutex);
    return m_count;
}

bool ConnectionThreads::waitForAll(Clock::time_point limit) {
    std::unique_lock lock(m_mutex);
    return m_changed.wait_until(lock, limit, [&] { return m_count == 0; });
}
