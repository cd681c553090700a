#include "host/silences/SilenceJson.h"

#include "host/base/JsonWriter.h"

#include <array>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

struct Member {
    const char* name;
    std::string SilenceMatch::*text;
};

constexpr std::array members = {
    Member{"situation", &SilenceMatch::situation},
    Member{"log", &SilenceMatch::log},
    Member{"severity", &SilenceMatch::severity},
    Member{"node", &SilenceMatch::node},
};

void writeMatch(JsonWriter& json, const SilenceMatch& match) {
    json.beginObject();
    if (match.isAll()) {
        json.member("all", true);
    }
    for (const Member& member : members) {
        if (const std::string& text = match.*member.text; !text.empty()) {
            json.member(member.name, text);
        }
    }
    if (!match.group.empty()) {
        json.key("group").beginObject();
        for (const auto& [name, value] : match.group) {
            json.member(name, value);
        }
        json.endObject();
    }
    json.endObject();
}

void writeTime(JsonWriter& json, const char* key, std::optional<std::int64_t> time) {
    json.key(key);
    if (time) {
        json.time(*time);
    } else {
        json.null();
    }
}

} // namespace

void SilenceJson::write(JsonWriter& json, const Silence& silence, std::int64_t now) {
    json.beginObject().member("id", silence.id);
    json.member("state", silence.isActive(now) ? "active" : "expired");
    json.key("match");
    writeMatch(json, silence.match);
    writeTime(json, "created", silence.created);
    writeTime(json, "until", silence.until);
    json.member("who", silence.who).member("why", silence.why);
    writeTime(json, "expired", silence.expired);
    json.textOrNull("expired_by", silence.expiredBy);
    json.member("events", silence.events);
    writeTime(json, "last", silence.last == 0 ? std::nullopt : std::optional(silence.last));
    json.endObject();
}

std::string SilenceJson::match(const SilenceMatch& match) {
    return JsonWriter::text([&](JsonWriter& json) { writeMatch(json, match); });
}

std::optional<SilenceMatch> SilenceJson::parseMatch(std::string_view text) {
    try {
        const auto document = nlohmann::json::parse(text);
        SilenceMatch match;
        for (const Member& member : members) {
            match.*member.text = document.value(member.name, "");
        }
        if (const auto group = document.find("group"); group != document.end()) {
            for (const auto& [name, value] : group->items()) {
                match.group.push_back({name, value.get<std::string>()});
            }
        }
        const bool isMeant = !match.isAll() || document.value("all", false);
        return isMeant ? std::optional(match) : std::nullopt;
    } catch (const nlohmann::json::exception&) {
        return std::nullopt;
    }
}

} // namespace zrm::host
