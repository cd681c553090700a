#ifndef ZRM_HOST_SCOPE_GUARDS_H
#define ZRM_HOST_SCOPE_GUARDS_H

#include "framework/locks.h"

#include <pthread.h>

namespace zrm::host {

/// Holds a lock of the framework for a scope.
class LockGuard {
public:
    explicit LockGuard(SYS1_Lock* lock) : m_lock(lock) { SYS1_GetLock(m_lock); }
    ~LockGuard() { SYS1_ReleaseLock(m_lock); }
    LockGuard(const LockGuard&) = delete;
    LockGuard& operator=(const LockGuard&) = delete;

private:
    SYS1_Lock* m_lock;
};

/// While it lives, the calling thread is not cancelled. Operations that must not be unwound, since
/// they are declared not to throw, put one around the system calls that are cancellation points.
/// Neither locks nor allocates.
class CancellationOff {
public:
    CancellationOff() noexcept { pthread_setcancelstate(PTHREAD_CANCEL_DISABLE, &m_before); }
    ~CancellationOff() {
        int ignored;
        pthread_setcancelstate(m_before, &ignored);
    }
    CancellationOff(const CancellationOff&) = delete;
    CancellationOff& operator=(const CancellationOff&) = delete;

private:
    int m_before = PTHREAD_CANCEL_ENABLE;
};

} // namespace zrm::host

#endif
