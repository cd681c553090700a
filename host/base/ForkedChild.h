#ifndef ZRM_HOST_FORKED_CHILD_H
#define ZRM_HOST_FORKED_CHILD_H

namespace zrm::host {

/// Tells a forked child, which must stay with async-signal-safe calls until its exec, from the
/// process that the host was started as.
namespace ForkedChild {

/// True in a process forked from the one that asked first. Neither locks nor allocates.
bool isCaller() noexcept;

} // namespace ForkedChild

} // namespace zrm::host

#endif
