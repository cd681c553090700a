#ifndef ZRM_DEBUG_LOG_LOSS_H
#define ZRM_DEBUG_LOG_LOSS_H

#include <cstdint>

namespace zrm {

/// Counts records that were not written completely to the debug log since the start. Any thread.
namespace DebugLogLoss {

std::uint64_t records() noexcept;

} // namespace DebugLogLoss

} // namespace zrm

#endif
