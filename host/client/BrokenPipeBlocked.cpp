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
        return; // it was blocked before and stays so
    }
    // A signal that waits would come as soon as it is let through.
    constexpr timespec atOnce{};
    sigtimedwait(&m_pipe, nullptr, &atOnce);
    pthread_sigmask(SIG_SETMASK, &m_before, nullptr);
}

} // namespace zrm::host
