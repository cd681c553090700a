#include "host/situations/SituationJson.h"

#include "host/base/TimeText.h"
#include "host/situations/SituationSet.h"

#include <cinttypes>
#include <cstddef>
#include <cstdint>
#include <cstdio>
#include <utility>

#include <xxhash.h>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = nlohmann::ordered_json;

constexpr const char* sources[] = {"file", "api"};
constexpr const char* states[] = {"running", "stopped", "failed"};

Json orNull(const std::optional<std::string>& text) {
    return text ? Json(*text) : Json();
}

} // namespace

Json SituationJson::definition(const SituationConfig& situation) {
    Json object = {{"name", situation.name},
                   {"text", situation.text},
                   {"severity", situation.severity},
                   {"log", orNull(situation.log)},
                   {"when", situation.when},
                   {"frequency", orNull(situation.frequency)},
                   {"period", orNull(situation.period)},
                   {"context", situation.context},
                   {"runbook", situation.runbook.empty() ? Json() : Json(situation.runbook)},
                   {"labels", situation.labels}};
    const JudgementConfig& judgement = situation.judgement;
    if (!judgement.groupBy.empty()) {
        object["group_by"] = judgement.groupBy;
        object["max_groups"] = judgement.maxGroups;
    }
    for (const auto& [key, value] :
         {std::pair("distinct", &judgement.distinct), std::pair("then", &judgement.then),
          std::pair("resolve_after", &judgement.resolveAfterText),
          std::pair("cooldown", &judgement.cooldownText),
          std::pair("absent", &judgement.absentText)}) {
        if (!value->empty()) {
            object[key] = *value;
        }
    }
    return object;
}

std::string SituationJson::version(const SituationConfig& situation) {
    const std::string content = text(definition(situation));
    char hash[17];
    std::snprintf(hash, sizeof hash, "%016" PRIx64,
                  std::uint64_t{XXH3_64bits(content.data(), content.size())});
    return hash;
}

Json SituationJson::status(const SituationStatus& status) {
    Json object = definition(status.config);
    object["version"] = version(status.config);
    object["source"] = sources[static_cast<std::size_t>(status.source)];
    object["state"] = states[static_cast<std::size_t>(status.state)];
    object["problem"] = status.problem.empty() ? Json() : Json(status.problem);
    object["counts"] = {{"offered", status.offered},
                        {"matched", status.matched},
                        {"discarded", status.discarded},
                        {"raised", status.raised}};
    object["last_raised"] =
        status.lastRaised == 0 ? Json() : Json(UtcTime::text(status.lastRaised));
    return object;
}

std::string SituationJson::text(const Json& value) {
    return value.dump(-1, ' ', false, Json::error_handler_t::replace);
}

} // namespace zrm::host
