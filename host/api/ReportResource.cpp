#include "host/api/ReportResource.h"

#include "base/ProcessValues.h"
#include "base/TraceScope.h"
#include "host/api/ReportRequest.h"
#include "host/config/Columns.h"
#include "host/events/RowJson.h"
#include "host/http/RequestRefused.h"
#include "host/http/Router.h"

#include <string>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"ReportResource.cpp"};

std::string columnNames() {
    std::string list = "[";
    for (const Column& column : columnsOf("RMLOGENT")) {
        list += list.size() == 1 ? "\"" : ",\"";
        list += column.name;
        list += '"';
    }
    return list + "]";
}

} // namespace

void ReportResource::addRoutes(Router& router) {
    router.add("POST", "/api/v1/reports",
               [this](const HttpRequest& request) { return report(request); });
}

HttpAnswer ReportResource::report(const HttpRequest& request) {
    TraceScope trace(anchor);
    const ReportRequest wanted = ReportRequest::parse(request.body);
    // Checked first: the agent treats a report on an unknown log as an internal error.
    if (!m_source.isMonitored(wanted.conditions)) {
        throw RequestRefused(404, "the agent does not monitor this log", "log");
    }
    const SampleSource::Rows rows = m_source.take("RMLOGENT", wanted.conditions);
    std::string text = "{\"log\":";
    RowJson::appendText(text, wanted.log);
    text += ",\"from\":\"" + wanted.from + "\",\"to\":\"" + wanted.to +
            "\",\"columns\":" + columnNames() + ",\"rows\":" + rows.json +
            ",\"count\":" + std::to_string(rows.count) +
            ",\"truncated\":" + (rows.truncated ? "true," : "false,") + rows.reachJson() +
            ",\"max_rows\":" + std::to_string(gMaxRows) + "}";
    return HttpAnswer::json(std::move(text));
}

} // namespace zrm::host
