#ifndef ZRM_HOST_FORKED_CHILD_H
#define ZRM_HOST_FORKED_CHILD_H

namespace zrm::host {

/// Distinguishes a forked child, which may use only async-signal-safe calls until its exec, from
/// the host's original process.
namespace ForkedChild {

/// True in a process forked from the one that made the first call. Neither locks nor allocates.
bool isCaller() noexcept;

} // namespace ForkedChild

} // namespace zrm::host

#endif
