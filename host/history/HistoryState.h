#ifndef ZRM_HOST_HISTORY_STATE_H
#define ZRM_HOST_HISTORY_STATE_H

#include <cstdint>
#include <string>

namespace zrm::host {

/// The contents and condition of the history.
struct HistoryState {
    std::uint64_t events = 0;  ///< number of events held
    std::uint64_t oldest = 0;  ///< id of the oldest event held; 0 when there is none
    std::uint64_t newest = 0;  ///< id of the newest event ever committed; 0 when there was none
    std::uint64_t bytes = 0;   ///< on disk, over all its files
    std::uint64_t damaged = 0; ///< number of damaged events found by readers since the start
    std::string problem;       ///< why it cannot store events now; empty: it can
};

} // namespace zrm::host

#endif
