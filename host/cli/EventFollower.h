#ifndef ZRM_HOST_EVENT_FOLLOWER_H
#define ZRM_HOST_EVENT_FOLLOWER_H

#include "host/cli/AgentClient.h"
#include "host/cli/StopSignals.h"

#include <chrono>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>

namespace zrm::host {

/// Follows the agent's live stream of events until it is stopped: each event behind the given one
/// once and in order, also when the connection is lost on the way.
class EventFollower {
public:
    using Json = AgentClient::Json;
    using Receiver = std::function<void(const Json& event)>;
    /// Tells the operator of a lost and of a new connection.
    using Note = std::function<void(const std::string& text)>;

    /// All of them outlive the object. `filters` are those of the route.
    EventFollower(AgentClient& client, AgentClient::Query filters, StopSignals& signals, Note note);

    /// Follows, beginning behind the event of this id. Returns after a signal; throws CliError
    /// when the agent refuses.
    void follow(std::uint64_t after, const Receiver& receiver);

private:
    bool connect(const Receiver& receiver);
    void adoptNewHistory();

    AgentClient& m_client;
    const AgentClient::Query m_filters;
    StopSignals& m_signals;
    const Note m_note;
    std::uint64_t m_last = 0; ///< the latest event that was handed over
    bool m_isLost = false;    ///< and the operator knows
};

} // namespace zrm::host

#endif
