#include "host/client/BrokenPipeBlocked.h"

#include <pthread.h>
#include <time.h>

namespace zrm::host {

BrokenPipeBlocked::BrokenPipeBlocked() {
    sigemptyset(&m_pipe);
    sigaddset(&m_pipe, SIGPIPE);
    pthread_sigmask(SIG_BLOCK, &m_pipe, &m_before);
}

BrokenPipeBlocked::~BrokenPipeBlocked() {
    if (sigismember(&m_before, SIGPIPE) == 1) {
        return; // it was already blocked and stays so
    }
    // A pending signal would be delivered as soon as it is unblocked.
    constexpr timespec atOnce{};
    sigtimedwait(&m_pipe, nullptr, &atOnce);
    pthread_sigmask(SIG_SETMASK, &m_before, nullptr);
}

} // namespace zrm::host
