#include "host/http/StopSignal.h"

#include <fcntl.h>
#include <unistd.h>

StopSignal::StopSignal() {
    int ends[2];
    if (pipe(ends) == -1) {
        return;
    }
    for (const int end : ends) {
        fcntl(end, F_SETFD, FD_CLOEXEC);
    }
    m_readEnd = ends[0];
    m_writeEnd = ends[1];
}

StopSignal::~StopSignal() {
    raise();
    if (m_readEnd != -1) {
        close(m_readEnd);
    }
}

void StopSignal::raise() noexcept {
    const int end = m_writeEnd.exchange(-1);
    if (end != -1) {
        close(end);
    }
}
