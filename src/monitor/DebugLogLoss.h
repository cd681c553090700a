#ifndef ZRM_DEBUG_LOG_LOSS_H
#define ZRM_DEBUG_LOG_LOSS_H

#include <cstdint>

namespace zrm {

/// Records that the debug log did not take whole, since the start. Any thread.
namespace DebugLogLoss {

std::uint64_t records() noexcept;

} // namespace DebugLogLoss

} // namespace zrm

#endif
