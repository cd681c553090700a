#ifndef ZRM_HOST_BROKEN_PIPE_BLOCKED_H
#define ZRM_HOST_BROKEN_PIPE_BLOCKED_H

#include <signal.h>

namespace zrm::host {

/// While it exists, writing to a connection closed by the peer does not raise SIGPIPE. The
/// process's SIGPIPE action is unchanged, since children inherit it. Created and destroyed on the
/// same thread.
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
