#include "host/http/EventStream.h"

#include "agent/TraceScope.h"
#include "host/history/HistoryReader.h"
#include "host/http/EventQuery.h"
#include "host/http/QueryFields.h"
#include "host/http/RequestRefused.h"
#include "host/http/Router.h"

#include <algorithm>
#include <charconv>
#include <limits>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

TRC1_Anchor anchor{"EventStream.cpp"};

constexpr std::size_t eventsAtOnce = 200;
constexpr auto watchInterval = 1s; ///< a client that has gone is noticed within it

/// The id after which a client wants to go on; none when it wants what is new.
std::optional<std::uint64_t> resumeAfter(const HttpRequest& request, QueryFields& query) {
    constexpr std::uint64_t mostId = std::numeric_limits<std::int64_t>::max();
    const std::optional<std::uint64_t> after = query.number("after", 0, mostId);
    const std::string& last = request.lastEventId;
    if (last.empty()) {
        return after;
    }
    std::uint64_t id = 0;
    const char* const end = last.data() + last.size();
    const auto [stop, error] = std::from_chars(last.data(), end, id);
    if (error != std::errc() || stop != end || id > mostId) {
        throw RequestRefused(400, "the id of an event is a whole number", "Last-Event-ID");
    }
    return id;
}

/// The event behind which the next query goes on.
std::uint64_t lastLookedAt(const EventPage& page, const EventFilter& filter, std::uint64_t newest) {
    const std::uint64_t last = page.events.empty() ? 0 : page.events.back().id;
    if (page.events.size() == filter.limit) {
        return last;
    }
    // A search that was not stopped early has seen all up to the newest, and maybe later ones.
    return page.reached.value_or(std::max(newest, last));
}

std::string messages(const std::vector<StoredEvent>& events) {
    std::string text;
    for (const StoredEvent& event : events) {
        text += "id: " + std::to_string(event.id) + "\nevent: event\ndata: " + event.json + "\n\n";
    }
    return text;
}

} // namespace

void EventStream::addRoutes(Router& router) {
    router.add("GET", "/api/v1/events/stream",
               [this](const HttpRequest& request) { return open(request); });
}

HttpAnswer EventStream::open(const HttpRequest& request) {
    TraceScope trace(anchor);
    HistoryReader& history = EventQuery::history(m_history);
    QueryFields query(request);
    EventFilter filter;
    EventQuery::readKinds(query, filter);
    const std::uint64_t newest = history.newest();
    // Ids beyond the newest are of a history that is gone.
    filter.after = std::min(resumeAfter(request, query).value_or(newest), newest);
    query.refuseUnknown();
    filter.limit = eventsAtOnce;
    filter.newestFirst = false;
    // Counts the client until the answer is gone, however it ends.
    const bool isTooMany = ++*m_clients > mostClients;
    const std::shared_ptr<void> place(nullptr, [clients = m_clients](void*) { --*clients; });
    if (isTooMany) {
        throw RequestRefused(
            503, "too many clients follow the events: at most " + std::to_string(mostClients), "");
    }
    HttpAnswer answer;
    answer.contentType = "text/event-stream";
    answer.stream = [this, filter, place](const BodyWriter& write, const std::stop_token& stop) {
        follow(filter, write, stop);
    };
    return answer;
}

void EventStream::follow(EventFilter filter, const BodyWriter& write,
                         const std::stop_token& stop) const {
    TraceScope trace(anchor);
    Clock::time_point silent = Clock::now() + m_interval; ///< for so long nothing needs to be sent
    bool isThere = write("retry: 2000\n\n");
    while (isThere && !stop.stop_requested()) {
        const Clock::time_point limit = std::min(silent, Clock::now() + watchInterval);
        const std::uint64_t newest = m_history->waitBeyond(filter.after, limit, stop);
        std::string text;
        if (newest > filter.after) {
            const EventPage page = m_history->query(filter);
            text = messages(page.events);
            filter.after = lastLookedAt(page, filter, newest);
        }
        if (text.empty() && Clock::now() >= silent) {
            text = ": keep-alive\n\n";
        }
        if (!text.empty()) {
            silent = Clock::now() + m_interval;
        }
        isThere = write(text);
    }
    trace.detail()("A client no longer follows the events.");
}
