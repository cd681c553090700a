#include "host/cli/EventFollower.h"

#include "host/cli/CliError.h"
#include "host/cli/JsonText.h"

#include <algorithm>
#include <utility>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

constexpr std::size_t longestEvent = 1024 * 1024; ///< bytes

} // namespace

SseParser::SseParser(Receiver receiver) : m_receiver(std::move(receiver)) {}

void SseParser::take(std::string_view piece) {
    if (m_line.size() + m_data.size() + piece.size() > longestEvent) {
        throw CliError(CliStatus::UNREACHABLE,
                       "what answers is not a zrmagent: an event of its stream is "
                       "longer than 1 MB");
    }
    for (std::size_t end = piece.find('\n'); end != std::string_view::npos;
         end = piece.find('\n')) {
        m_line += piece.substr(0, end);
        piece.remove_prefix(end + 1);
        if (m_line.ends_with('\r')) {
            m_line.pop_back();
        }
        const std::string whole = std::exchange(m_line, {});
        line(whole);
    }
    m_line += piece;
}

void SseParser::line(std::string_view line) {
    if (line.empty()) {
        if (std::exchange(m_hasData, false)) {
            m_receiver(std::exchange(m_data, {}));
        }
        return;
    }
    constexpr std::string_view field = "data:";
    if (!line.starts_with(field)) {
        return; // a comment, or a field that repeats what the data says
    }
    line.remove_prefix(line.starts_with("data: ") ? field.size() + 1 : field.size());
    m_data += m_hasData ? "\n" : "";
    m_data += line;
    m_hasData = true;
}

namespace {

using namespace std::chrono_literals;

constexpr std::chrono::milliseconds shortestPause = 200ms;
constexpr std::chrono::milliseconds longestPause = 5s;

} // namespace

EventFollower::EventFollower(AgentClient& client, AgentClient::Query filters, StopSignals& signals,
                             Note note)
    : m_client(client), m_filters(std::move(filters)), m_signals(signals), m_note(std::move(note)) {
}

void EventFollower::follow(std::uint64_t after, const Receiver& receiver) {
    m_last = after;
    m_signals.onStop([this] { m_client.stop(); });
    std::chrono::milliseconds pause = shortestPause;
    try {
        while (!m_signals.isStopped()) {
            pause = connect(receiver) ? shortestPause : std::min(2 * pause, longestPause);
            // The signal may have come while there was no connection.
            if (m_signals.isStopped() || m_signals.wait(pause)) {
                break;
            }
        }
    } catch (...) {
        m_signals.onStop({});
        throw;
    }
    m_signals.onStop({});
}

bool EventFollower::connect(const Receiver& receiver) {
    bool hasReceived = false;
    SseParser parser([&](const std::string& data) {
        const Json event = JsonText::parse(data);
        const std::uint64_t id = event.is_discarded() ? 0 : JsonText::number(event, "id");
        if (id > m_last) {
            receiver(event);
            m_last = id;
        }
    });
    try {
        if (m_isLost) {
            adoptNewHistory();
        }
        AgentClient::Query query = m_filters;
        query.emplace("after", std::to_string(m_last));
        m_client.stream("/api/v1/events/stream", query, [&](std::string_view piece) {
            if (std::exchange(m_isLost, false)) {
                m_note("reconnected");
            }
            hasReceived = true;
            parser.take(piece);
        });
    } catch (const CliError& error) {
        if (error.status() != CliStatus::UNREACHABLE || !(m_isLost || m_signals.isStopped())) {
            throw;
        }
    }
    if (!m_signals.isStopped() && !std::exchange(m_isLost, true)) {
        m_note("the connection to the agent was lost; reconnecting");
    }
    return hasReceived;
}

void EventFollower::adoptNewHistory() {
    const Json answer = m_client.get("/api/v1/events", {{"limit", "1"}});
    if (JsonText::member(answer, "newest").is_number() &&
        JsonText::number(answer, "newest") < m_last) {
        m_note("the agent has started a new history; its events follow from the first");
        m_last = 0;
    }
}

} // namespace zrm::host
