#ifndef ZRM_HOST_RATES_H
#define ZRM_HOST_RATES_H

#include <cstdint>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

/// How much came in of one log, step by step. A step of which nothing is known, because no agent
/// ran, has no value.
struct LogRates {
    using Counts = std::vector<std::optional<std::uint64_t>>;

    std::string log; ///< the monitored log's whole path
    Counts entries;  ///< entries read
    Counts events;   ///< events raised
};

/// How much came in of every log that had an entry or an event in a window of time.
struct Rates {
    std::int64_t start = 0;     ///< of the first step: milliseconds since 1970-01-01, UTC
    std::int64_t step = 0;      ///< milliseconds
    std::vector<LogRates> logs; ///< by path; each has as many counts as the window has steps
};

} // namespace zrm::host

#endif
