#include "host/api/EventsResource.h"

#include "base/TraceScope.h"
#include "host/api/EventQuery.h"
#include "host/base/JsonWriter.h"
#include "host/base/TimeText.h"
#include "host/history/HistoryReader.h"
#include "host/http/QueryFields.h"
#include "host/http/RequestRefused.h"
#include "host/http/Router.h"

#include <algorithm>
#include <charconv>
#include <chrono>
#include <limits>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"EventsResource.cpp"};

/// The largest id that the history can store.
constexpr std::uint64_t mostId = std::numeric_limits<std::int64_t>::max();
constexpr std::uint64_t defaultEvents = 100;
constexpr std::uint64_t mostEvents = 1000;
constexpr std::int64_t minute = 60'000; ///< milliseconds
constexpr std::int64_t day = 24 * 60 * minute;
constexpr std::int64_t mostSteps = 2 * 24 * 60;

bool isNewestFirst(QueryFields& query) {
    const std::string order = query.text("order").value_or("desc");
    if (order != "asc" && order != "desc") {
        throw RequestRefused(400, "write asc or desc", "order");
    }
    return order == "desc";
}

EventFilter filterOf(const HttpRequest& request) {
    QueryFields query(request);
    EventFilter filter;
    filter.after = query.number("after", 0, mostId).value_or(0);
    filter.before = query.number("before", 0, mostId);
    filter.from = query.time("from");
    filter.to = query.time("to");
    EventQuery::readKinds(query, filter);
    filter.limit = query.number("limit", 1, mostEvents).value_or(defaultEvents);
    filter.newestFirst = isNewestFirst(query);
    query.refuseUnknown();
    return filter;
}

/// The window of rates and its steps: milliseconds.
struct Window {
    std::int64_t from;
    std::int64_t to;
    std::int64_t step;
    std::optional<std::string> log; ///< only this one
};

Window windowOf(const HttpRequest& request) {
    QueryFields query(request);
    Window window{};
    window.to = query.time("to").value_or(WallClock::now());
    window.from = query.time("from").value_or(window.to - day);
    window.step = static_cast<std::int64_t>(query.number("step", 60, 86'400).value_or(60)) * 1000;
    window.log = query.text("log");
    query.refuseUnknown();
    if (window.step % minute != 0) {
        throw RequestRefused(400, "write a multiple of 60 seconds", "step");
    }
    if (window.from > window.to) {
        throw RequestRefused(400, "is before from", "to");
    }
    if ((window.to - window.from) / window.step > mostSteps) {
        throw RequestRefused(400, "the window has more than 2880 steps", "step");
    }
    return window;
}

} // namespace

void EventsResource::addRoutes(Router& router) {
    router.add("GET", "/api/v1/events",
               [this](const HttpRequest& request) { return events(request); });
    router.add("GET", "/api/v1/events/{id}",
               [this](const HttpRequest& request) { return event(request); });
    router.add("GET", "/api/v1/rates",
               [this](const HttpRequest& request) { return rates(request); });
}

HttpAnswer EventsResource::events(const HttpRequest& request) {
    TraceScope trace(anchor);
    HistoryReader& history = EventQuery::history(m_history);
    EventFilter filter = filterOf(request);
    const std::size_t limit = filter.limit++; // one extra, to see whether there are more
    const EventPage page = EventQuery::valueOf(history.query(filter));
    const HistoryState state = history.state();
    const std::size_t count = std::min(limit, page.events.size());
    const std::optional<std::uint64_t> next =
        page.events.size() > limit ? std::optional(page.events[count - 1].id) : page.reached;
    return HttpAnswer::json(JsonWriter::text([&](JsonWriter& json) {
        json.beginObject().key("events").beginArray();
        for (std::size_t at = 0; at < count; ++at) {
            json.raw(page.events[at].json);
        }
        json.endArray().member("next", next);
        json.member("oldest", state.oldest).member("newest", state.newest);
        json.member("damaged", page.damaged).endObject();
    }));
}

HttpAnswer EventsResource::event(const HttpRequest& request) {
    TraceScope trace(anchor);
    HistoryReader& history = EventQuery::history(m_history);
    QueryFields(request).refuseUnknown();
    const std::string& text = request.captures.front();
    std::uint64_t id = 0;
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, id);
    if (error != std::errc() || stop != end || id > mostId) {
        throw RequestRefused(404, "an event's id is a whole number", "id");
    }
    const std::optional<StoredEvent> event = EventQuery::valueOf(history.event(id));
    if (!event) {
        throw RequestRefused(404, "the history does not contain this event", "id");
    }
    return HttpAnswer::json(event->json);
}

HttpAnswer EventsResource::rates(const HttpRequest& request) {
    TraceScope trace(anchor);
    HistoryReader& history = EventQuery::history(m_history);
    const Window window = windowOf(request);
    const Rates rates = EventQuery::valueOf(history.rates(window.from, window.to, window.step));
    return HttpAnswer::json(JsonWriter::text([&](JsonWriter& json) {
        json.beginObject().key("start").time(rates.start).member("step", rates.step / 1000);
        json.key("logs").beginArray();
        for (const LogRates& log : rates.logs) {
            if (!window.log || log.log == *window.log) {
                json.beginObject().member("log", log.log);
                json.member("entries", log.entries).member("events", log.events).endObject();
            }
        }
        json.endArray().endObject();
    }));
}

} // namespace zrm::host
