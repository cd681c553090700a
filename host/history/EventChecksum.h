#ifndef ZRM_HOST_EVENT_CHECKSUM_H
#define ZRM_HOST_EVENT_CHECKSUM_H

#include <cstdint>
#include <string_view>

namespace zrm::host {

/// The checksum stored beside an event: readers recompute it, so that data corrupted on disk is
/// detected and not served. It covers the event's id, time, label and JSON.
std::int64_t eventChecksum(std::int64_t id, std::int64_t raised, std::int64_t label,
                           std::string_view json) noexcept;

} // namespace zrm::host

#endif
