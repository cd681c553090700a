#ifndef ZRM_MANAGER_CANCELLATION_H
#define ZRM_MANAGER_CANCELLATION_H

#include <pthread.h>

namespace zrm {

/// Lets the manager thread be cancelled while it lives: around the calls in which the thread waits.
/// Everywhere else cancellation is forbidden, since files, locks and half-built chains would be
/// left behind, and since a cancellation cannot unwind through the noexcept calls of the trace.
class ManagerCancellation {
public:
    ManagerCancellation() { set(PTHREAD_CANCEL_ENABLE); }
    ~ManagerCancellation() { forbid(); }
    ManagerCancellation(const ManagerCancellation&) = delete;
    ManagerCancellation& operator=(const ManagerCancellation&) = delete;

    /// Forbids cancellation of the calling thread until an object lives; at the thread's start.
    static void forbid() { set(PTHREAD_CANCEL_DISABLE); }

private:
    static void set(int state) {
        int previous = 0;
        pthread_setcancelstate(state, &previous);
    }
};

} // namespace zrm

#endif
