#ifndef ZRM_LOCK_GUARD_H
#define ZRM_LOCK_GUARD_H

#include "framework/locks.h"

namespace zrm {

/// Holds a lock of the framework. Lives on the stack of one thread.
class LockGuard {
public:
    explicit LockGuard(SYS1_Lock* lock) : m_lock(lock) { SYS1_GetLock(m_lock); }
    ~LockGuard() { SYS1_ReleaseLock(m_lock); }
    LockGuard(const LockGuard&) = delete;
    LockGuard& operator=(const LockGuard&) = delete;

private:
    SYS1_Lock* m_lock;
};

} // namespace zrm

#endif
