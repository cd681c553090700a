#ifndef ZRM_HOST_EVENT_FOLLOWER_H
#define ZRM_HOST_EVENT_FOLLOWER_H

#include "host/cli/AgentClient.h"
#include "host/cli/StopSignals.h"

#include <chrono>
#include <cstdint>
#include <functional>
#include <optional>
#include <string>
#include <string_view>

namespace zrm::host {

/// Parses server-sent events from pieces as they arrive.
class SseParser {
public:
    /// Called with the data of each complete event.
    using Receiver = std::function<void(const std::string& data)>;

    explicit SseParser(Receiver receiver);

    /// Takes a piece and calls the receiver for each event that it completes. An incomplete event
    /// is dropped with the object.
    void take(std::string_view piece);

private:
    void line(std::string_view line);

    Receiver m_receiver;
    std::string m_line; ///< the part of the line received so far
    std::string m_data;
    bool m_hasData = false;
};

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
