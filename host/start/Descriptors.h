#ifndef ZRM_HOST_DESCRIPTORS_H
#define ZRM_HOST_DESCRIPTORS_H

#include <cstdint>

namespace zrm::host {

/// The process's descriptors: one for each log, beside those of HTTP, the history and the sinks.
class Descriptors {
public:
    /// Raises the process's soft limit as far as the system lets it, and as is sensible. Once, at
    /// the start.
    static void raiseLimit();

    /// Says how many logs could not be opened for want of a descriptor, when no more were since the
    /// last call. To be called about once a second, by one thread.
    void tick();

private:
    std::uint64_t m_seen = 0; ///< at the last call
    std::uint64_t m_told = 0;
};

} // namespace zrm::host

#endif
