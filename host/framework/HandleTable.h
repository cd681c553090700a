#ifndef ZRM_HOST_HANDLE_TABLE_H
#define ZRM_HOST_HANDLE_TABLE_H

class ctreq;

namespace zrm::host {

/// The handles of the open requests and their pins. A handle is an index with a generation, so a
/// handle that outlived its request finds nothing: it is given out again only after 65535 other
/// uses of its index, and freed indexes are taken oldest first. Any thread; pinning and unpinning
/// neither lock nor allocate. The table is never destroyed.
namespace HandleTable {

/// Gives the request a handle; 0 when there is none left (65536 open requests) or no memory.
unsigned open(ctreq* request) noexcept;

/// Pins the request of this handle; null when it has none, or is being closed.
ctreq* pin(unsigned handle) noexcept;

/// Takes one pin back. Nothing happens when the handle is not pinned.
void unpin(unsigned handle) noexcept;

/// Refuses further pins, waits until the last one was taken back, and frees the handle. Nothing
/// happens when the handle is not open. The calling thread must hold no pin on it.
void close(unsigned handle) noexcept;

} // namespace HandleTable

} // namespace zrm::host

#endif
