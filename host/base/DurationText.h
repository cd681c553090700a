#ifndef ZRM_HOST_DURATION_TEXT_H
#define ZRM_HOST_DURATION_TEXT_H

#include <chrono>
#include <optional>
#include <string_view>

namespace zrm::host {

/// Lengths of time as operators write them. Stateless.
class DurationText {
public:
    /// The length of "60s", "5m", "1h" or "1d"; none for any other text, for none at all ("0s"),
    /// and for one of more than 2147483647 seconds.
    static std::optional<std::chrono::seconds> parse(std::string_view text);
};

} // namespace zrm::host

#endif
