#ifndef ZRM_REQUEST_THRESHOLDS_H
#define ZRM_REQUEST_THRESHOLDS_H

#include <cstdint>

namespace zrm {

/// A report's time window and a situation's event-rate thresholds. The log types' report functions
/// take its address.
struct _RequestThresholds {
    char startTime[17];           ///< 16-character time stamp, terminated; empty if not given
    char endTime[17];             ///< the same
    std::int64_t freqThreshold;   ///< N: at least N entries in the period; -N: at most N; 0: none
    std::int64_t periodThreshold; ///< seconds; 0: none
};

} // namespace zrm

#endif
