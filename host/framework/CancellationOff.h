#ifndef ZRM_HOST_CANCELLATION_OFF_H
#define ZRM_HOST_CANCELLATION_OFF_H

#include <pthread.h>

namespace zrm::host {

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
