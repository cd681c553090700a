#ifndef ZRM_TESTS_FAULT_STATE_H
#define ZRM_TESTS_FAULT_STATE_H

/// What the wrapped calls of Faults.cpp and Fakes.cpp share.

/// The error with which a call of this function is to fail now, 0 when it is to pass.
int fault(const char* function);

/// Holds the lock of the planned faults and of the fakes' texts. A spin lock, since
/// pthread_mutex_lock is one of the wrapped calls; calls that its holder makes always pass.
class FaultLock {
public:
    FaultLock();
    ~FaultLock();
    FaultLock(const FaultLock&) = delete;
    FaultLock& operator=(const FaultLock&) = delete;
};

#endif
