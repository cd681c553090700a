#include "host/api/EpisodesResource.h"

#include "base/TraceScope.h"
#include "host/api/EventQuery.h"
#include "host/base/JsonWriter.h"
#include "host/history/HistoryReader.h"
#include "host/http/QueryFields.h"
#include "host/http/RequestRefused.h"

#include <algorithm>
#include <charconv>
#include <limits>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"EpisodesResource.cpp"};

constexpr std::uint64_t mostId = std::numeric_limits<std::int64_t>::max();
constexpr std::uint64_t defaultEpisodes = 100;
constexpr std::uint64_t mostEpisodes = 1000;
constexpr std::int64_t second = 1000; // milliseconds

/// "NAME=VALUE".
GroupValue groupValueOf(const std::string& text) {
    const std::size_t sign = text.find('=');
    if (sign == 0 || sign == std::string::npos) {
        throw RequestRefused(400, "write NAME=VALUE, for example ip=203.0.113.7", "group");
    }
    return {text.substr(0, sign), text.substr(sign + 1)};
}

EpisodeFilter filterOf(const HttpRequest& request) {
    QueryFields query(request);
    EpisodeFilter filter;
    filter.before = query.number("before", 0, mostId);
    if (const std::optional<std::string> state = query.text("state")) {
        if (*state != "open" && *state != "resolved") {
            throw RequestRefused(400, "write open or resolved", "state");
        }
        filter.isOpen = *state == "open";
    }
    filter.situations = query.texts("situation");
    filter.logs = query.texts("log");
    for (const std::string& text : query.texts("group")) {
        filter.group.push_back(groupValueOf(text));
    }
    filter.limit = query.number("limit", 1, mostEpisodes).value_or(defaultEpisodes);
    query.refuseUnknown();
    return filter;
}

void write(JsonWriter& json, const EpisodeRecord& episode) {
    json.member("id", episode.id).member("state", episode.isOpen ? "open" : "resolved");
    json.member("situation", episode.situation).member("severity", episode.severity);
    json.member("log", episode.log).key("group").raw(episode.groups);
    json.key("raised").time(episode.raised).member("count", episode.count);
    json.key("first").time(episode.first * second).key("last").time(episode.last * second);
    json.key("resolved");
    if (episode.isOpen) {
        json.null();
    } else {
        json.time(episode.resolved);
    }
    json.key("reason");
    if (episode.reason.empty()) {
        json.null();
    } else {
        json.value(episode.reason);
    }
    json.key("logs").beginArray();
    for (const EpisodeShare& share : episode.shares) {
        json.beginObject().member("log", share.log).member("count", share.count);
        json.key("first").time(share.first * second);
        json.key("last").time(share.last * second).endObject();
    }
    json.endArray();
}

} // namespace

void EpisodesResource::addRoutes(Router& router) {
    router.add("GET", "/api/v1/episodes",
               [this](const HttpRequest& request) { return episodes(request); });
    router.add("GET", "/api/v1/episodes/{id}",
               [this](const HttpRequest& request) { return episode(request); });
}

HttpAnswer EpisodesResource::episodes(const HttpRequest& request) {
    TraceScope trace(anchor);
    HistoryReader& history = EventQuery::history(m_history);
    EpisodeFilter filter = filterOf(request);
    const std::size_t limit = filter.limit++; // one extra, to see whether there are more
    const std::vector<EpisodeRecord> found = EventQuery::valueOf(history.episodes(filter));
    const std::size_t count = std::min(limit, found.size());
    return HttpAnswer::json(JsonWriter::text([&](JsonWriter& json) {
        json.beginObject().key("episodes").beginArray();
        for (std::size_t at = 0; at < count; ++at) {
            json.beginObject();
            write(json, found[at]);
            json.endObject();
        }
        json.endArray();
        json.member("next", found.size() > limit ? std::optional(found[count - 1].id)
                                                 : std::optional<std::uint64_t>());
        json.endObject();
    }));
}

HttpAnswer EpisodesResource::episode(const HttpRequest& request) {
    TraceScope trace(anchor);
    HistoryReader& history = EventQuery::history(m_history);
    QueryFields(request).refuseUnknown();
    const std::string& text = request.captures.front();
    EpisodeFilter filter;
    filter.id = 0;
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, *filter.id);
    if (error != std::errc() || stop != end || *filter.id > mostId) {
        throw RequestRefused(404, "an episode's id is a whole number", "id");
    }
    const std::vector<EpisodeRecord> found = EventQuery::valueOf(history.episodes(filter));
    if (found.empty()) {
        throw RequestRefused(404, "the history does not contain this episode", "id");
    }
    std::vector<std::string> events;
    for (const std::uint64_t id : {found.front().id, found.front().resolvedBy}) {
        if (auto event = EventQuery::valueOf(history.event(id))) {
            events.push_back(std::move(event->json));
        }
    }
    return HttpAnswer::json(JsonWriter::text([&](JsonWriter& json) {
        json.beginObject();
        write(json, found.front());
        json.key("events").beginArray();
        for (const std::string& event : events) {
            json.raw(event);
        }
        json.endArray().endObject();
    }));
}

} // namespace zrm::host
