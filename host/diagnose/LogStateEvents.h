#ifndef ZRM_HOST_LOG_STATE_EVENTS_H
#define ZRM_HOST_LOG_STATE_EVENTS_H

#include "host/diagnose/LogStates.h"
#include "host/events/EventQueue.h"

#include <array>
#include <chrono>
#include <cstddef>
#include <cstdint>
#include <map>
#include <memory>
#include <string>
#include <vector>

namespace zrm::host {

/// Raises and resolves the events of the built-in situations `log-quiet`, `log-dead` and
/// `log-unparsed`, an episode for each state of a log. One thread.
class LogStateEvents {
public:
    using Clock = LogStates::Clock;

    /// How long a log may be missing from the list until its states are over: a refresh takes less,
    /// and so does a start.
    static constexpr std::chrono::seconds longestGap{30};

    /// Continues with the episodes that an earlier run has left. The queue outlives the object.
    LogStateEvents(EventQueue& queue, Clock::time_point now);

    /// Takes what is known of the logs now. `wall` is in milliseconds since 1970.
    void judge(const std::vector<LogState>& states, Clock::time_point now, std::int64_t wall);

private:
    struct Key {
        LogState::Kind kind;
        std::string log;
        auto operator<=>(const Key&) const = default;
    };
    struct Lasting {
        std::shared_ptr<EpisodeId> id;
        std::int64_t first = 0; ///< seconds since 1970
        std::string node;
        Clock::time_point seen; ///< in the list of states
    };

    void raise(const LogState& state, Clock::time_point now, std::int64_t wall);
    void resolve(const Key& key, const Lasting& episode, std::int64_t wall, const char* reason);

    EventQueue& m_queue;
    const std::array<std::shared_ptr<const SituationLabel>, LogState::kinds> m_labels;
    std::map<Key, Lasting> m_episodes;
};

} // namespace zrm::host

#endif
