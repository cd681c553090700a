#include "host/api/SituationsResource.h"

#include "host/api/SituationBody.h"
#include "host/base/UrlText.h"
#include "host/http/JsonFields.h"
#include "host/http/QueryFields.h"
#include "host/http/RequestRefused.h"
#include "host/http/Router.h"
#include "host/situations/SituationJson.h"

#include <optional>
#include <string>
#include <utility>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using Json = nlohmann::ordered_json;

int statusOf(SituationRefusal::Reason reason) {
    switch (reason) {
    case SituationRefusal::UNKNOWN:
        return 404;
    case SituationRefusal::EXISTS:
    case SituationRefusal::FROM_FILE:
    case SituationRefusal::TOO_MANY:
        return 409;
    case SituationRefusal::CHANGED:
        return 412;
    case SituationRefusal::NOT_SAVED:
    case SituationRefusal::BUSY:
        break;
    }
    return 503;
}

[[noreturn]] void refuse(const SituationRefusal& refusal) {
    throw RequestRefused(statusOf(refusal.reason), refusal.problem);
}

Json jsonOf(const Problem& problem) {
    return {{"field", problem.field}, {"detail", problem.text()}};
}

HttpAnswer answerOf(const SituationSet::Change& change) {
    if (!change) {
        refuse(change.error());
    }
    const Json status = SituationJson::status(*change);
    return HttpAnswer::json(SituationJson::text(status));
}

} // namespace

void SituationsResource::addRoutes(Router& router) {
    const auto answer = [&](const char* method, const char* pattern, auto handler) {
        router.add(method, pattern, std::move(handler));
    };
    answer("GET", "/api/v1/situations", [this](const HttpRequest& request) {
        QueryFields(request).refuseUnknown();
        return list();
    });
    answer("POST", "/api/v1/situations",
           [this](const HttpRequest& request) { return add(request); });
    answer("POST", "/api/v1/situations/validate", &SituationsResource::validate);
    answer("GET", "/api/v1/situations/{name}",
           [this](const HttpRequest& request) { return show(request); });
    answer("PUT", "/api/v1/situations/{name}",
           [this](const HttpRequest& request) { return replace(request); });
    answer("DELETE", "/api/v1/situations/{name}",
           [this](const HttpRequest& request) { return remove(request); });
    answer("POST", "/api/v1/situations/{name}/start", [this](const HttpRequest& request) {
        JsonFields(request.body).refuseUnknown();
        return answerOf(m_situations.start(request.captures.front()));
    });
    answer("POST", "/api/v1/situations/{name}/stop", [this](const HttpRequest& request) {
        JsonFields(request.body).refuseUnknown();
        return answerOf(m_situations.stop(request.captures.front()));
    });
}

HttpAnswer SituationsResource::list() const {
    Json situations = Json::array();
    for (const SituationStatus& status : m_situations.list()) {
        situations.push_back(SituationJson::status(status));
    }
    return HttpAnswer::json(SituationJson::text({{"situations", std::move(situations)}}));
}

HttpAnswer SituationsResource::show(const HttpRequest& request) const {
    QueryFields(request).refuseUnknown();
    const std::string& name = request.captures.front();
    const std::optional<SituationStatus> status = m_situations.find(name);
    if (!status) {
        throw RequestRefused(404, "there is no situation '" + name + "'", "name");
    }
    return HttpAnswer::json(SituationJson::text(SituationJson::status(*status)));
}

HttpAnswer SituationsResource::add(const HttpRequest& request) {
    JsonFields fields(request.body);
    const SituationConfig situation = SituationBody::situation(fields);
    HttpAnswer answer = answerOf(m_situations.add(situation));
    answer.status = 201;
    answer.headers.emplace_back("Location",
                                "/api/v1/situations/" + UrlText::encode(situation.name));
    return answer;
}

HttpAnswer SituationsResource::replace(const HttpRequest& request) {
    const std::string& name = request.captures.front();
    JsonFields fields(request.body);
    const std::optional<std::string> version = fields.optionalText("version");
    const SituationConfig situation = SituationBody::situation(fields, name);
    if (situation.name != name) {
        throw RequestRefused(400,
                             "a situation keeps its name: leave it out, or create a new situation "
                             "and remove this one",
                             "name");
    }
    return answerOf(m_situations.replace(situation, version));
}

HttpAnswer SituationsResource::remove(const HttpRequest& request) {
    JsonFields(request.body).refuseUnknown();
    if (const auto removed = m_situations.remove(request.captures.front()); !removed) {
        refuse(removed.error());
    }
    return {204, "", ""};
}

HttpAnswer SituationsResource::validate(const HttpRequest& request) {
    JsonFields fields(request.body);
    Json problems = Json::array();
    try {
        const SituationText text = SituationBody::text(fields);
        for (const SituationProblem& problem : SituationValidator::check(text).problems) {
            problems.push_back(jsonOf(problem));
        }
    } catch (const RequestRefused& refused) {
        // A member of the wrong type prevents the others from being read.
        problems.push_back(jsonOf(refused.problem()));
    }
    return HttpAnswer::json(SituationJson::text({{"problems", std::move(problems)}}));
}

} // namespace zrm::host
