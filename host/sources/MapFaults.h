#ifndef ZRM_HOST_MAP_FAULTS_H
#define ZRM_HOST_MAP_FAULTS_H

#include <cstdint>

namespace zrm::host {

/// While it exists, its thread survives reading a mapped file that was cut off, or that the disk
/// does not give: the page reads as zeros, which the reader of the file takes for damage. Elsewhere
/// such a fault ends the process as usual.
class MapFaults {
public:
    MapFaults() noexcept;
    ~MapFaults();
    MapFaults(const MapFaults&) = delete;
    MapFaults& operator=(const MapFaults&) = delete;

    /// How many pages the calling thread could not read so far.
    static std::uint64_t count() noexcept;
};

} // namespace zrm::host

#endif
