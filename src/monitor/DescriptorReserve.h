#ifndef ZRM_DESCRIPTOR_RESERVE_H
#define ZRM_DESCRIPTOR_RESERVE_H

#include <cstdint>

namespace zrm {

/// The descriptors that logs leave for everything else. No matter how many logs there are, the
/// framework stays reachable and can open the descriptors it needs to store and deliver events. Any
/// thread.
namespace DescriptorReserve {

/// The number of descriptors in the reserve: the last 256 below the process's limit, or a quarter
/// of the limit if that is less.
std::uint64_t size();

/// Opens a log's file for reading. Does not block: a pipe may be in its place. Returns the
/// descriptor, or -1 with errno: EMFILE if only descriptors of the reserve are left. Counts the
/// failure if descriptors ran out.
int openLog(const char* path) noexcept;

/// The number of failed opens of a log since the start because descriptors ran out.
std::uint64_t failures() noexcept;

} // namespace DescriptorReserve

} // namespace zrm

#endif
