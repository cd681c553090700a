#include "host/api/SampleResource.h"

#include "host/base/JsonWriter.h"
#include "host/config/Columns.h"
#include "host/config/ConditionBuilder.h"
#include "host/http/JsonFields.h"
#include "host/http/RequestRefused.h"
#include "host/http/Router.h"

#include <algorithm>
#include <cstdint>
#include <limits>
#include <optional>
#include <string>
#include <utility>
#include <variant>
#include <vector>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using nlohmann::json;
using Conditions = std::vector<Condition>;

constexpr std::size_t mostFilters = 100;

[[noreturn]] void refuse(std::string what, std::string field) {
    throw RequestRefused(400, std::move(what), std::move(field));
}

std::optional<ConditionValue::Item> item(const json& value) {
    if (value.is_string()) {
        return value.get<std::string>();
    }
    if (value.is_number_unsigned() &&
        value.get<std::uint64_t>() > std::numeric_limits<std::int64_t>::max()) {
        return std::numeric_limits<std::int64_t>::max();
    }
    if (value.is_number_integer()) {
        return value.get<std::int64_t>();
    }
    return std::nullopt;
}

ConditionValue readValue(const json& value, const std::string& field) {
    ConditionValue result;
    result.isList = value.is_array();
    for (const json& one : result.isList ? value : json::array({value})) {
        std::optional<ConditionValue::Item> read = item(one);
        if (!read) {
            refuse("write a text, a whole number, or a list of them", field);
        }
        result.items.push_back(std::move(*read));
    }
    return result;
}

/// Refuses a filter that is not an object of exactly column, op and value.
void checkForm(const json& filter, const std::string& field) {
    if (!filter.is_object()) {
        refuse("write an object with column, op and value", field);
    }
    for (const auto& [key, value] : filter.items()) {
        if (key != "column" && key != "op" && key != "value") {
            refuse("unknown member; a filter has column, op and value",
                   std::string(field).append(".").append(key));
        }
    }
    for (const char* const key : {"column", "op"}) {
        if (!filter.contains(key) || !filter[key].is_string()) {
            refuse("write a text", field + "." + key);
        }
    }
    if (!filter.contains("value")) {
        refuse("is missing", field + ".value");
    }
}

Condition readFilter(const ConditionBuilder& builder, const json& filter, const std::string& field,
                     PatternBudget& budget) {
    checkForm(filter, field);
    const ConditionValue value = readValue(filter["value"], field + ".value");
    Result<Condition> condition = builder.build(filter["column"].get<std::string>(),
                                                filter["op"].get<std::string>(), value, budget);
    if (!condition) {
        Problem& problem = condition.error();
        problem.field.insert(0, field + '.');
        throw RequestRefused(400, std::move(problem));
    }
    if (condition->isOnField()) {
        throw RequestRefused(400, {"the rows of a sample have no fields",
                                   "name a column, or use a report (POST /api/v1/reports, zrmctl "
                                   "report) or an explanation (POST /api/v1/explain, zrmctl "
                                   "explain), which judge conditions on fields",
                                   field + ".column"});
    }
    return std::move(*condition);
}

/// Refuses a report on Log Entries that does not say on what.
void checkReport(const Conditions& conditions) {
    const auto has = [&](std::string_view column, _IntfOper op) {
        return std::any_of(conditions.begin(), conditions.end(), [&](const Condition& condition) {
            return condition.column == column && condition.op == op;
        });
    };
    if (!has("LOGPATH", INTF_EQUAL) && !has("ULOGPATH", INTF_EQUAL)) {
        refuse("name the log's directory: LOGPATH or ULOGPATH with =", "filters");
    }
    if (!has("LOGNAME", INTF_EQUAL) && !has("ULOGNAME", INTF_EQUAL)) {
        refuse("name the log: LOGNAME or ULOGNAME with =", "filters");
    }
    if (!has("ENTRYTIME", INTF_GREATER_OR_EQUAL) || !has("ENTRYTIME", INTF_LESS_OR_EQUAL)) {
        refuse("give the time window: ENTRYTIME with >= and with <=", "filters");
    }
}

} // namespace

Conditions SampleRequest::parse(std::string_view table, std::string_view body) {
    JsonFields fields(body);
    const json& filters = fields.value("filters");
    fields.refuseUnknown();
    if (!filters.is_null() && (!filters.is_array() || filters.size() > mostFilters)) {
        fields.refuse("filters", "write a list of at most 100 filters");
    }
    const ConditionBuilder builder(table);
    PatternBudget budget;
    Conditions conditions;
    for (std::size_t index = 0; index < filters.size(); ++index) {
        conditions.push_back(
            readFilter(builder, filters[index], fields.place("filters", index), budget));
    }
    if (table == "RMLOGENT") {
        checkReport(conditions);
    }
    return conditions;
}

void SampleResource::addRoutes(Router& router) {
    router.add("POST", "/api/v1/tables/{table}/sample",
               [this](const HttpRequest& request) { return sample(request); });
}

HttpAnswer SampleResource::sample(const HttpRequest& request) {
    const std::string& table = request.captures.front();
    if (columnsOf(table).empty()) {
        throw RequestRefused(404, "no such table; the tables are RMLOGENT and RMMONLOG", "table");
    }
    const std::vector<Condition> wanted = SampleRequest::parse(table, request.body);
    // Checked first: the agent treats a report on an unknown log as an internal error.
    if (table == "RMLOGENT" && !m_source.isMonitored(wanted)) {
        throw RequestRefused(404, "the agent does not monitor this log", "filters");
    }
    const SampleSource::Rows rows = m_source.take(table, wanted);
    return HttpAnswer::json(JsonWriter::text([&](JsonWriter& json) {
        json.beginObject().member("table", table);
        rows.write(json);
        json.endObject();
    }));
}

} // namespace zrm::host
