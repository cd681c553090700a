#include "host/api/RulesResource.h"

#include "base/TraceScope.h"
#include "host/http/QueryFields.h"
#include "host/situations/SituationJson.h"
#include "host/situations/SituationSet.h"

#include <utility>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"RulesResource.cpp"};

using Json = nlohmann::ordered_json;

/// The names of the situations that a rule was switched on as.
Json usesOf(const std::string& rule, const std::vector<SituationStatus>& situations) {
    Json names = Json::array();
    for (const SituationStatus& situation : situations) {
        if (situation.config.rule == rule) {
            names.push_back(situation.config.name);
        }
    }
    return names;
}

} // namespace

RulesResource::RulesResource(std::vector<std::string> directories, const SituationSet& situations)
    : m_rules(std::move(directories)), m_situations(situations) {}

void RulesResource::addRoutes(Router& router) {
    router.add("GET", "/api/v1/rules",
               [this](const HttpRequest& request) { return list(request); });
}

HttpAnswer RulesResource::list(const HttpRequest& request) const {
    TraceScope trace(anchor);
    QueryFields(request).refuseUnknown();
    const std::vector<SituationStatus> situations = m_situations.list();
    Json all = Json::array();
    for (const ReadyRules::Place& place : m_rules.list()) {
        const auto rule = ReadyRules::load(place);
        all.push_back({{"name", place.name},
                       {"description", rule ? rule->about : ""},
                       {"path", place.path},
                       {"problem", rule ? Json() : Json(rule.error().front())},
                       {"logs", rule ? Json(rule->logs) : Json::array()},
                       {"format", rule && !rule->format.empty() ? Json(rule->format) : Json()},
                       {"definition", rule ? SituationJson::definition(rule->situation) : Json()},
                       {"used_by", usesOf(place.name, situations)}});
    }
    return HttpAnswer::json(SituationJson::text({{"rules", all}}));
}

} // namespace zrm::host
