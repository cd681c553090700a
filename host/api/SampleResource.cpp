#include "host/api/SampleResource.h"

#include "host/api/SampleRequest.h"
#include "host/config/Columns.h"
#include "host/http/RequestRefused.h"
#include "host/http/Router.h"

#include <string>
#include <variant>

namespace zrm::host {

void SampleResource::addRoutes(Router& router) {
    router.add("POST", "/api/v1/tables/{table}/sample",
               [this](const HttpRequest& request) { return sample(request); });
}

HttpAnswer SampleResource::sample(const HttpRequest& request) {
    const std::string& table = request.captures.front();
    if (columnsOf(table).empty()) {
        throw RequestRefused(404, "no such table; the tables are RMLOGENT and RMMONLOG", "table");
    }
    const auto conditions = SampleRequest::parse(table, request.body);
    if (const auto* const problem = std::get_if<Problem>(&conditions)) {
        throw RequestRefused(*problem);
    }
    const auto& wanted = std::get<std::vector<Condition>>(conditions);
    // Checked first: the agent treats a report on an unknown log as an internal error.
    if (table == "RMLOGENT" && !m_source.isMonitored(wanted)) {
        throw RequestRefused(404, "the agent does not monitor this log", "filters");
    }
    const SampleSource::Rows rows = m_source.take(table, wanted);
    return HttpAnswer::json("{\"table\":\"" + table + "\",\"rows\":" + rows.json +
                            ",\"count\":" + std::to_string(rows.count) + ",\"truncated\":" +
                            (rows.truncated ? "true," : "false,") + rows.reachJson() + "}");
}

} // namespace zrm::host
