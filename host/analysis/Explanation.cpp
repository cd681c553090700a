#include "host/analysis/Explanation.h"

#include "host/base/JsonWriter.h"

#include <cstddef>
#include <type_traits>
#include <variant>

namespace zrm::host {

namespace {

void write(JsonWriter& json, const ConditionVerdict& verdict) {
    json.beginObject().member("condition", verdict.condition).key("value");
    std::visit(
        [&](const auto& held) {
            if constexpr (std::is_same_v<decltype(held), const std::nullptr_t&>) {
                json.null();
            } else {
                json.value(held);
            }
        },
        verdict.value);
    json.member("holds", verdict.holds).endObject();
}

void write(JsonWriter& json, const Explanation::Window& window) {
    json.beginObject().member("frequency", window.frequency).member("period", window.period);
    json.member("count", window.count).endObject();
}

constexpr std::int64_t milliseconds = 1000; // in a second

} // namespace

void writeGroup(JsonWriter& json, const std::vector<GroupValue>& group) {
    json.beginObject();
    for (const GroupValue& one : group) {
        json.member(one.name, one.value);
    }
    json.endObject();
}

void Explanation::write(JsonWriter& json) const {
    json.beginObject().member("line", line).member("event", event).key("row");
    row.empty() ? json.null() : json.raw(row);
    json.textOrNull("reason", reason);
    json.key("conditions").beginArray();
    for (const ConditionVerdict& verdict : conditions) {
        host::write(json, verdict);
    }
    json.endArray().member("matches", matches).key("window");
    window ? host::write(json, *window) : void(json.null());
    if (!group.empty()) {
        json.key("group");
        writeGroup(json, group);
    }
    if (episode) {
        json.key("episode").beginObject().key("first").time(episode->first * milliseconds);
        json.member("count", episode->count).endObject();
    }
    json.member("raised", isRaised).member("decision", decision).endObject();
}

} // namespace zrm::host
