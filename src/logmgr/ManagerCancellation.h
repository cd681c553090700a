#ifndef ZRM_MANAGER_CANCELLATION_H
#define ZRM_MANAGER_CANCELLATION_H

#include <pthread.h>

namespace zrm {

/// Allows cancellation of the manager thread while the object lives, around calls in which the
/// thread waits. Cancellation is disabled everywhere else: it would leak files, locks and
/// half-built chains, and it cannot unwind through the noexcept calls of the trace.
class ManagerCancellation {
public:
    ManagerCancellation() { set(PTHREAD_CANCEL_ENABLE); }
    ~ManagerCancellation() { forbid(); }
    ManagerCancellation(const ManagerCancellation&) = delete;
    ManagerCancellation& operator=(const ManagerCancellation&) = delete;

    /// Disables cancellation of the calling thread. Called at the thread's start.
    static void forbid() { set(PTHREAD_CANCEL_DISABLE); }

private:
    static void set(int state) {
        int previous = 0;
        pthread_setcancelstate(state, &previous);
    }
};

} // namespace zrm

#endif
