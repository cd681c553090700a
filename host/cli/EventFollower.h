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

/// Follows the agent's live event stream until stopped. Delivers each event after the given one
/// once and in order, even when the connection is lost in between.
class EventFollower {
public:
    using Json = AgentClient::Json;
    using Receiver = std::function<void(const Json& event)>;
    /// Informs the operator that the connection was lost or restored.
    using Note = std::function<void(const std::string& text)>;

    /// All references must outlive the object. `filters` are the query parameters of the route.
    EventFollower(AgentClient& client, AgentClient::Query filters, StopSignals& signals, Note note);

    /// Follows the events after this id. Returns after a signal; throws CliError when the agent
    /// refuses.
    void follow(std::uint64_t after, const Receiver& receiver);

private:
    bool connect(const Receiver& receiver);
    void adoptNewHistory();

    AgentClient& m_client;
    const AgentClient::Query m_filters;
    StopSignals& m_signals;
    const Note m_note;
    std::uint64_t m_last = 0; ///< id of the latest event passed on
    bool m_isLost = false;    ///< and the operator has been informed
};

} // namespace zrm::host

#endif
