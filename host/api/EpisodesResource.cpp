#include "host/api/EpisodesResource.h"

#include "base/TraceScope.h"
#include "host/api/EventQuery.h"
#include "host/base/JsonWriter.h"
#include "host/base/TimeText.h"
#include "host/history/Acknowledgements.h"
#include "host/history/HistoryReader.h"
#include "host/http/JsonFields.h"
#include "host/http/QueryFields.h"
#include "host/http/RequestRefused.h"

#include <algorithm>
#include <charconv>
#include <limits>
#include <optional>
#include <string>
#include <utility>
#include <vector>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"EpisodesResource.cpp"};

constexpr std::uint64_t mostId = std::numeric_limits<std::int64_t>::max();
constexpr std::uint64_t defaultEpisodes = 100;
constexpr std::uint64_t mostEpisodes = 1000;
constexpr std::size_t mostValues = 100; ///< of a parameter
constexpr std::int64_t second = 1000;   // milliseconds

/// "NAME=VALUE".
GroupValue groupValueOf(const std::string& text) {
    const std::size_t sign = text.find('=');
    if (sign == 0 || sign == std::string::npos) {
        throw RequestRefused(400, "write NAME=VALUE, for example ip=203.0.113.7", "group");
    }
    return {text.substr(0, sign), text.substr(sign + 1)};
}

std::uint64_t idOf(const std::string& text, int statusOfProblem) {
    std::uint64_t id = 0;
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, id);
    if (error != std::errc() || stop != end || id > mostId) {
        throw RequestRefused(statusOfProblem, "an episode's id is a whole number", "id");
    }
    return id;
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
    if (const std::optional<std::string> isAcknowledged = query.text("acknowledged")) {
        if (*isAcknowledged != "true" && *isAcknowledged != "false") {
            throw RequestRefused(400, "write true or false", "acknowledged");
        }
        filter.isAcknowledged = *isAcknowledged == "true";
    }
    for (const std::string& text : query.texts("id")) {
        filter.ids.push_back(idOf(text, 400));
    }
    filter.situations = query.texts("situation");
    filter.logs = query.texts("log");
    for (const auto& [name, count] :
         {std::pair("id", filter.ids.size()), std::pair("situation", filter.situations.size()),
          std::pair("log", filter.logs.size())}) {
        if (count > mostValues) {
            throw RequestRefused(400, "the parameter appears more than 100 times", name);
        }
    }
    for (const std::string& text : query.texts("group")) {
        filter.group.push_back(groupValueOf(text));
    }
    filter.limit = query.number("limit", 1, mostEpisodes).value_or(defaultEpisodes);
    query.refuseUnknown();
    return filter;
}

void write(JsonWriter& json, const Acknowledgement& acknowledged) {
    if (acknowledged.who.empty()) {
        json.null();
        return;
    }
    json.beginObject().key("time").time(acknowledged.time);
    json.member("who", acknowledged.who).member("note", acknowledged.note).endObject();
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
    json.key("acknowledged");
    write(json, episode.acknowledged);
    json.key("logs").beginArray();
    for (const EpisodeShare& share : episode.shares) {
        json.beginObject().member("log", share.log).member("count", share.count);
        json.key("first").time(share.first * second);
        json.key("last").time(share.last * second).endObject();
    }
    json.endArray();
}

void limitLength(JsonFields& fields, const char* key, const std::string& text) {
    if (text.size() > Acknowledgement::longestText) {
        fields.refuse(key,
                      Problem{"has " + std::to_string(text.size()) + " bytes",
                              "write at most " + std::to_string(Acknowledgement::longestText)});
    }
}

Acknowledgement acknowledgementOf(const std::string& body) {
    JsonFields fields(body);
    Acknowledgement by;
    by.time = WallClock::now();
    by.who = fields.text("who");
    if (by.who.empty()) {
        fields.refuse("who", Problem{"is empty", "write a name, which others will read"});
    }
    by.note = fields.optionalText("note").value_or("");
    limitLength(fields, "who", by.who);
    limitLength(fields, "note", by.note);
    fields.refuseUnknown();
    return by;
}

AcknowledgementChange storedOr503(const Result<AcknowledgementChange>& change) {
    if (!change) {
        throw RequestRefused(503, change.error());
    }
    return *change;
}

/// The episode as it is now, unless the change was not made.
HttpAnswer answerTo(AcknowledgementChange change, const EpisodeRecord& episode) {
    const std::string name = "episode " + std::to_string(episode.id);
    switch (change) {
    case AcknowledgementChange::UNKNOWN:
        throw RequestRefused(404, "the history does not contain this episode", "id");
    case AcknowledgementChange::RESOLVED:
        throw RequestRefused(409, name + " is resolved; only open ones are acknowledged", "id");
    case AcknowledgementChange::TAKEN:
        throw RequestRefused(409,
                             Problem{name + " was acknowledged by " + episode.acknowledged.who +
                                         " at " + UtcTime::text(episode.acknowledged.time),
                                     "withdraw that first", "id"});
    case AcknowledgementChange::NOT_TAKEN:
        throw RequestRefused(409, "nobody has acknowledged " + name, "id");
    case AcknowledgementChange::DONE:
        break;
    }
    return HttpAnswer::json(JsonWriter::text([&](JsonWriter& json) {
        json.beginObject();
        write(json, episode);
        json.endObject();
    }));
}

} // namespace

void EpisodesResource::addRoutes(Router& router) {
    router.add("GET", "/api/v1/episodes",
               [this](const HttpRequest& request) { return episodes(request); });
    router.add("GET", "/api/v1/episodes/{id}",
               [this](const HttpRequest& request) { return episode(request); });
    router.add("POST", "/api/v1/episodes/{id}/ack",
               [this](const HttpRequest& request) { return acknowledge(request); });
    router.add("DELETE", "/api/v1/episodes/{id}/ack",
               [this](const HttpRequest& request) { return withdraw(request); });
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
    const EpisodeRecord found = find(idOf(request.captures.front(), 404));
    std::vector<std::string> events;
    for (const std::uint64_t id : {found.id, found.resolvedBy}) {
        if (auto event = EventQuery::valueOf(history.event(id))) {
            events.push_back(std::move(event->json));
        }
    }
    return HttpAnswer::json(JsonWriter::text([&](JsonWriter& json) {
        json.beginObject();
        write(json, found);
        json.key("events").beginArray();
        for (const std::string& event : events) {
            json.raw(event);
        }
        json.endArray().endObject();
    }));
}

EpisodeRecord EpisodesResource::find(std::uint64_t id) {
    EpisodeFilter filter;
    filter.ids = {id};
    std::vector<EpisodeRecord> found = EventQuery::valueOf(m_history->episodes(filter));
    if (found.empty()) {
        throw RequestRefused(404, "the history does not contain this episode", "id");
    }
    return std::move(found.front());
}

HttpAnswer EpisodesResource::acknowledge(const HttpRequest& request) {
    TraceScope trace(anchor);
    QueryFields(request).refuseUnknown();
    const Acknowledgement by = acknowledgementOf(request.body);
    EventQuery::history(m_history);
    const std::uint64_t id = idOf(request.captures.front(), 404);
    const auto change = m_acknowledgements->acknowledge(id, by);
    return answerTo(storedOr503(change), find(id));
}

HttpAnswer EpisodesResource::withdraw(const HttpRequest& request) {
    TraceScope trace(anchor);
    QueryFields(request).refuseUnknown();
    JsonFields(request.body).refuseUnknown();
    EventQuery::history(m_history);
    const std::uint64_t id = idOf(request.captures.front(), 404);
    const auto change = m_acknowledgements->withdraw(id);
    return answerTo(storedOr503(change), find(id));
}

} // namespace zrm::host
