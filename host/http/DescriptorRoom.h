#ifndef ZRM_HOST_DESCRIPTOR_ROOM_H
#define ZRM_HOST_DESCRIPTOR_ROOM_H

#include <cstddef>

namespace zrm::host {

/// The descriptors of the process that connections may use.
struct DescriptorRoom {
    std::size_t count = 0; ///< number of connections
    int lowest = 0;        ///< the lowest descriptor for a connection

    /// Room for this many connections, or for as many as possible. Raises the process's soft limit
    /// of descriptors if it is too low, and leaves enough of them for the agent.
    static DescriptorRoom make(std::size_t wanted);
};

} // namespace zrm::host

#endif
