#ifndef ZRM_HOST_SINK_STATE_H
#define ZRM_HOST_SINK_STATE_H

#include <chrono>
#include <cstdint>
#include <optional>
#include <string>

namespace zrm::host {

/// How the delivery to one sink stands.
struct SinkState {
    enum class Condition {
        STARTING, ///< nothing was offered yet
        UP,       ///< the last delivery was whole
        FAILING,  ///< the last delivery was not, and will be tried again, or this one makes no way
    };

    std::string name;
    std::string type; ///< as the configuration has it: "jsonl"
    Condition condition = Condition::STARTING;
    std::uint64_t lag = 0;       ///< events that it has still to get
    std::uint64_t delivered = 0; ///< events that it got since the agent's start
    std::uint64_t failures = 0;  ///< deliveries that were not whole
    std::string error;           ///< why the last delivery failed; empty when it did not
    std::optional<std::chrono::milliseconds> retryIn; ///< until the next try, while it waits

    /// The condition's name: "starting", "up" or "failing".
    const char* conditionName() const noexcept {
        return condition == Condition::UP        ? "up"
               : condition == Condition::FAILING ? "failing"
                                                 : "starting";
    }
};

} // namespace zrm::host

#endif
