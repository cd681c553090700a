#ifndef ZRM_HOST_BROKEN_PIPE_BLOCKED_H
#define ZRM_HOST_BROKEN_PIPE_BLOCKED_H

#include <signal.h>

namespace zrm::host {

/// While it lives, writing to a connection that the other side has closed does not signal the
/// process, whose action for SIGPIPE stays as it is: children inherit that. One thread's, made and
/// destroyed on it.
class BrokenPipeBlocked {
public:
    BrokenPipeBlocked();
    ~BrokenPipeBlocked();
    BrokenPipeBlocked(const BrokenPipeBlocked&) = delete;
    BrokenPipeBlocked& operator=(const BrokenPipeBlocked&) = delete;

private:
    sigset_t m_pipe{};
    sigset_t m_before{};
};

} // namespace zrm::host

#endif
