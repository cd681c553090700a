#include "host/analysis/Explanation.h"

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = nlohmann::ordered_json;

template <typename Value> Json orNull(const std::optional<Value>& value) {
    return value ? Json(*value) : Json();
}

Json of(const ConditionVerdict& verdict) {
    Json value;
    std::visit([&](const auto& held) { value = held; }, verdict.value);
    return {{"condition", verdict.condition}, {"value", value}, {"holds", verdict.holds}};
}

} // namespace

Json ExplanationJson::of(const Explanation& explanation) {
    Json conditions = Json::array();
    for (const ConditionVerdict& verdict : explanation.conditions) {
        conditions.push_back(zrm::host::of(verdict));
    }
    Json window;
    if (explanation.window) {
        window = {{"frequency", explanation.window->frequency},
                  {"period", explanation.window->period},
                  {"count", orNull(explanation.window->count)}};
    }
    return {{"line", orNull(explanation.line)},
            {"event", orNull(explanation.event)},
            {"row", explanation.row.empty() ? Json() : Json::parse(explanation.row)},
            {"reason", explanation.reason.empty() ? Json() : Json(explanation.reason)},
            {"conditions", conditions},
            {"matches", explanation.matches},
            {"window", window},
            {"raised", explanation.isRaised},
            {"decision", explanation.decision}};
}

} // namespace zrm::host
