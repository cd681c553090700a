#ifndef ZRM_FRAMEWORK_LOCKS_H
#define ZRM_FRAMEWORK_LOCKS_H

#include <pthread.h>

/// A mutual-exclusion lock of the framework. Not recursive.
struct SYS1_Lock {
    pthread_mutex_t mutex = PTHREAD_MUTEX_INITIALIZER;
};

/// Takes the lock. Waits while another thread holds it.
void SYS1_GetLock(SYS1_Lock* lock);

/// Releases a lock held by the calling thread.
void SYS1_ReleaseLock(SYS1_Lock* lock);

#endif
