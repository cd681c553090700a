#ifndef ZRM_HOST_DURATION_TEXT_H
#define ZRM_HOST_DURATION_TEXT_H

#include <chrono>
#include <optional>
#include <string_view>

namespace zrm::host {

/// Durations as written by operators. Stateless.
class DurationText {
public:
    /// The duration of "60s", "5m", "1h" or "1d"; none for any other text, for zero ("0s"), and for
    /// more than 2147483647 seconds.
    static std::optional<std::chrono::seconds> parse(std::string_view text);
};

} // namespace zrm::host

#endif
