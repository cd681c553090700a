#include "host/api/ReportResource.h"

#include "base/ProcessValues.h"
#include "base/TraceScope.h"
#include "host/base/JsonWriter.h"
#include "host/base/TimeText.h"
#include "host/config/Columns.h"
#include "host/config/ConditionBuilder.h"
#include "host/config/ConditionParser.h"
#include "host/http/JsonFields.h"
#include "host/http/RequestRefused.h"
#include "host/http/Router.h"

#include <optional>
#include <string>
#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"ReportResource.cpp"};

constexpr std::size_t mostConditions = 100;

/// The default end of a report: the last time that a stamp can express.
constexpr const char* endOfTime = "1991231235959999";

std::string readTime(JsonFields& fields, const char* key, std::optional<std::string> text) {
    if (!text) {
        return endOfTime;
    }
    std::optional<std::string> stamp = TimeText::toStamp(*text);
    if (!stamp) {
        fields.refuse(key, "'" + *text +
                               "' is not a time; write it like 2026-11-20T07:03:09, followed by Z "
                               "or +01:00 unless it is local, or as a 16-digit time stamp");
    }
    return std::move(*stamp);
}

std::vector<Condition> readLog(JsonFields& fields, const std::string& log) {
    auto conditions = ConditionBuilder::ofLog(log);
    if (!conditions) {
        fields.refuse("log", conditions.error());
    }
    return std::move(*conditions);
}

Condition bound(_IntfOper op, std::string stamp) {
    Condition condition;
    condition.column = "ENTRYTIME";
    condition.op = op;
    condition.text = std::move(stamp);
    return condition;
}

} // namespace

ReportRequest ReportRequest::parse(std::string_view body) {
    JsonFields fields(body);
    ReportRequest report;
    report.log = fields.text("log");
    report.conditions = readLog(fields, report.log);
    report.from = readTime(fields, "from", fields.text("from"));
    report.to = readTime(fields, "to", fields.optionalText("to"));
    const std::vector<std::string> where = fields.texts("where", mostConditions);
    fields.refuseUnknown();
    if (report.from > report.to) {
        fields.refuse("to", "is before from");
    }
    report.conditions.push_back(bound(INTF_GREATER_OR_EQUAL, report.from));
    report.conditions.push_back(bound(INTF_LESS_OR_EQUAL, report.to));
    const ConditionParser parser("RMLOGENT");
    for (std::size_t index = 0; index < where.size(); ++index) {
        Result<Condition> condition = parser.parse(where[index]);
        if (!condition) {
            fields.refuse("where[" + std::to_string(index) + "]", condition.error());
        }
        report.conditions.push_back(std::move(*condition));
    }
    return report;
}

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
    return HttpAnswer::json(JsonWriter::text([&](JsonWriter& json) {
        json.beginObject().member("log", wanted.log);
        json.member("from", wanted.from).member("to", wanted.to);
        json.key("columns").beginArray();
        for (const Column& column : columnsOf("RMLOGENT")) {
            json.value(column.name);
        }
        json.endArray();
        rows.write(json);
        json.member("max_rows", gMaxRows).endObject();
    }));
}

} // namespace zrm::host
