#ifndef ZRM_HOST_DESCRIPTOR_ROOM_H
#define ZRM_HOST_DESCRIPTOR_ROOM_H

#include <cstddef>

namespace zrm::host {

/// The part of the process's descriptors that connections may take.
struct DescriptorRoom {
    std::size_t count = 0; ///< of connections
    int lowest = 0;        ///< the smallest descriptor of a connection

    /// Room for so many connections, or for as many as there can be: raises the process's soft
    /// limit of descriptors where it is too low, and leaves enough of them to the agent.
    static DescriptorRoom make(std::size_t wanted);
};

} // namespace zrm::host

#endif
