#ifndef ZRM_HOST_LOCK_GUARD_H
#define ZRM_HOST_LOCK_GUARD_H

#include "framework/locks.h"

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

} // namespace zrm::host

#endif
