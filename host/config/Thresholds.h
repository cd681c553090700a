#ifndef ZRM_HOST_THRESHOLDS_H
#define ZRM_HOST_THRESHOLDS_H

#include "host/framework/Condition.h"

#include <optional>
#include <string_view>

namespace zrm::host {

/// The event-rate thresholds of a situation as written by operators. Stateless.
class Thresholds {
public:
    /// The FREQTHRESH condition of ">= 5", "> 4", "<= 2" or "< 3"; none for any other text, and for
    /// a bound that the agent would not apply (at most 0, at least 0).
    static std::optional<Condition> frequency(std::string_view text);

    /// The PERIODTHRS condition of "60s", "5m", "1h" or "1d"; none for any other text.
    static std::optional<Condition> period(std::string_view text);

    /// Whether a condition on FREQTHRESH or PERIODTHRS puts a threshold in force.
    static bool isFrequency(const Condition& condition) noexcept;
    static bool isPeriod(const Condition& condition) noexcept;
};

} // namespace zrm::host

#endif
