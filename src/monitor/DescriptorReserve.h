#ifndef ZRM_DESCRIPTOR_RESERVE_H
#define ZRM_DESCRIPTOR_RESERVE_H

#include <cstdint>

namespace zrm {

/// The part of the process's descriptors that logs leave to everything else: however many logs
/// there are, the framework can be reached, and what it stores and delivers finds descriptors. Any
/// thread.
namespace DescriptorReserve {

/// How many descriptors logs leave: the last 256 below the process's limit, or a quarter of them
/// where that is less.
std::uint64_t size();

/// Whether the descriptor, just opened for a log, is one of those.
bool has(int descriptor);

/// Notes that a log could not be opened, with errno: counted where it is for want of a descriptor.
void noteFailure(int number) noexcept;

/// How often a log could not be opened for want of a descriptor since the start.
std::uint64_t failures() noexcept;

} // namespace DescriptorReserve

} // namespace zrm

#endif
