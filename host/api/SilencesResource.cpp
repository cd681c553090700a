#include "host/api/SilencesResource.h"

#include "base/TraceScope.h"
#include "host/base/JsonWriter.h"
#include "host/base/TimeText.h"
#include "host/http/JsonFields.h"
#include "host/http/QueryFields.h"
#include "host/http/RequestRefused.h"
#include "host/silences/SilenceJson.h"
#include "host/silences/Silences.h"

#include <charconv>
#include <cstdint>
#include <limits>
#include <optional>
#include <string>
#include <utility>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"SilencesResource.cpp"};

[[noreturn]] void refuse(const SilenceRefusal& refusal) {
    const auto status = [&] {
        switch (refusal.reason) {
        case SilenceRefusal::UNKNOWN:
            return 404;
        case SilenceRefusal::OVER:
        case SilenceRefusal::TOO_MANY:
            return 409;
        case SilenceRefusal::NOT_KEPT:
            break;
        }
        return 503;
    };
    throw RequestRefused(status(), refusal.problem);
}

/// The id in the path; 0, which no silence has, for what is not a number.
std::uint64_t idOf(const HttpRequest& request) {
    const std::string& text = request.captures.front();
    std::uint64_t id = 0;
    const char* const end = text.data() + text.size();
    const auto [stop, error] = std::from_chars(text.data(), end, id);
    const bool isId = error == std::errc() && stop == end &&
                      id <= std::uint64_t{std::numeric_limits<std::int64_t>::max()};
    if (!isId) {
        throw RequestRefused(404, "a silence's id is a whole number", "id");
    }
    return id;
}

/// A pattern, which may be left out but not be empty.
std::string pattern(JsonFields& fields, const char* key) {
    const std::optional<std::string> text = fields.optionalText(key);
    if (text && text->empty()) {
        fields.refuse(key, Problem{"is empty", "leave it out"});
    }
    return text.value_or("");
}

void readGroup(JsonFields fields, const nlohmann::json& names, SilenceMatch& match) {
    for (const auto& [name, value] : names.items()) {
        match.group.push_back({name, fields.text(name)});
    }
}

SilenceMatch matchOf(JsonFields& fields, bool& isAll) {
    SilenceMatch match;
    match.situation = pattern(fields, "situation");
    match.log = pattern(fields, "log");
    match.severity = pattern(fields, "severity");
    match.node = pattern(fields, "node");
    if (auto group = fields.optionalObject("group")) {
        readGroup(std::move(*group), fields.value("group"), match);
    }
    const nlohmann::json& all = fields.value("all");
    if (!all.is_null() && !all.is_boolean()) {
        fields.refuse("all", "write true or false");
    }
    isAll = all.is_boolean() && all.get<bool>();
    fields.refuseUnknown();
    return match;
}

SilenceRequest requestOf(const std::string& body) {
    JsonFields fields(body);
    SilenceRequest request;
    if (auto match = fields.optionalObject("match")) {
        request.match = matchOf(*match, request.isAll);
    }
    request.until = fields.text("until");
    request.who = fields.text("who");
    request.why = fields.text("why");
    fields.refuseUnknown();
    return request;
}

HttpAnswer answerWith(const Silence& silence) {
    return HttpAnswer::json(JsonWriter::text(
        [&](JsonWriter& json) { SilenceJson::write(json, silence, WallClock::now()); }));
}

} // namespace

void SilencesResource::addRoutes(Router& router) {
    router.add("GET", "/api/v1/silences",
               [this](const HttpRequest& request) { return list(request); });
    router.add("POST", "/api/v1/silences",
               [this](const HttpRequest& request) { return add(request); });
    router.add("GET", "/api/v1/silences/{id}",
               [this](const HttpRequest& request) { return show(request); });
    router.add("DELETE", "/api/v1/silences/{id}",
               [this](const HttpRequest& request) { return expire(request); });
}

HttpAnswer SilencesResource::list(const HttpRequest& request) const {
    TraceScope trace(anchor);
    QueryFields query(request);
    const std::optional<std::string> state = query.text("state");
    query.refuseUnknown();
    if (state && *state != "active" && *state != "expired") {
        throw RequestRefused(400, "write active or expired, or leave it out", "state");
    }
    const std::int64_t now = WallClock::now();
    return HttpAnswer::json(JsonWriter::text([&](JsonWriter& json) {
        json.beginObject().key("silences").beginArray();
        for (const Silence& silence : m_silences.list()) {
            if (!state || silence.isActive(now) == (*state == "active")) {
                SilenceJson::write(json, silence, now);
            }
        }
        json.endArray().member("kept", m_silences.areKept()).endObject();
    }));
}

HttpAnswer SilencesResource::show(const HttpRequest& request) const {
    TraceScope trace(anchor);
    QueryFields(request).refuseUnknown();
    const std::uint64_t id = idOf(request);
    const std::optional<Silence> silence = m_silences.find(id);
    if (!silence) {
        throw RequestRefused(404, "silence " + std::to_string(id) + " does not exist", "id");
    }
    return answerWith(*silence);
}

HttpAnswer SilencesResource::add(const HttpRequest& request) {
    TraceScope trace(anchor);
    const Result<Silence> silence = requestOf(request.body).check(WallClock::now());
    if (!silence) {
        throw RequestRefused(400, silence.error());
    }
    const Silences::Change added = m_silences.add(*silence);
    if (!added) {
        refuse(added.error());
    }
    HttpAnswer answer = answerWith(*added);
    answer.status = 201;
    answer.headers.emplace_back("Location", "/api/v1/silences/" + std::to_string(added->id));
    return answer;
}

HttpAnswer SilencesResource::expire(const HttpRequest& request) {
    TraceScope trace(anchor);
    const std::uint64_t id = idOf(request);
    JsonFields fields(request.body);
    const std::string who = fields.optionalText("who").value_or("");
    fields.refuseUnknown();
    if (who.size() > SilenceRequest::longestText) {
        fields.refuse("who",
                      "write at most " + std::to_string(SilenceRequest::longestText) + " bytes");
    }
    const Silences::Change expired = m_silences.expire(id, who, WallClock::now());
    if (!expired) {
        refuse(expired.error());
    }
    return answerWith(*expired);
}

} // namespace zrm::host
