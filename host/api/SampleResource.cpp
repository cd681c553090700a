#include "host/api/SampleResource.h"

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

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

using nlohmann::json;
using Conditions = std::vector<Condition>;

constexpr std::size_t mostFilters = 100;

Problem bad(std::string detail, std::string field) {
    return {400, std::move(detail), std::move(field)};
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

std::variant<ConditionValue, Problem> readValue(const json& value, const std::string& field) {
    ConditionValue result;
    result.isList = value.is_array();
    for (const json& one : result.isList ? value : json::array({value})) {
        std::optional<ConditionValue::Item> read = item(one);
        if (!read) {
            return bad("write a text, a whole number, or a list of them", field);
        }
        result.items.push_back(std::move(*read));
    }
    return result;
}

std::string fieldOf(ConditionProblem::Part part, const std::string& filter) {
    switch (part) {
    case ConditionProblem::COLUMN:
        return filter + ".column";
    case ConditionProblem::OPERATOR:
        return filter + ".op";
    case ConditionProblem::VALUE:
        break;
    }
    return filter + ".value";
}

/// What is wrong with a filter's form: not an object of exactly column, op and value.
std::optional<Problem> checkForm(const json& filter, const std::string& field) {
    if (!filter.is_object()) {
        return bad("write an object with column, op and value", field);
    }
    for (const auto& [key, value] : filter.items()) {
        if (key != "column" && key != "op" && key != "value") {
            return bad("unknown member; a filter has column, op and value",
                       std::string(field).append(".").append(key));
        }
    }
    for (const char* const key : {"column", "op"}) {
        if (!filter.contains(key) || !filter[key].is_string()) {
            return bad("write a text", field + "." + key);
        }
    }
    if (!filter.contains("value")) {
        return bad("is missing", field + ".value");
    }
    return std::nullopt;
}

std::variant<Condition, Problem> readFilter(const ConditionBuilder& builder, const json& filter,
                                            const std::string& field, PatternBudget& budget) {
    if (std::optional<Problem> problem = checkForm(filter, field)) {
        return std::move(*problem);
    }
    auto value = readValue(filter["value"], field + ".value");
    if (auto* const problem = std::get_if<Problem>(&value)) {
        return std::move(*problem);
    }
    auto result =
        builder.build(filter["column"].get<std::string>(), filter["op"].get<std::string>(),
                      std::get<ConditionValue>(value), budget);
    if (const auto* const problem = std::get_if<ConditionProblem>(&result)) {
        return bad(problem->what + "; " + problem->cure, fieldOf(problem->part, field));
    }
    return std::get<Condition>(std::move(result));
}

/// What a report on Log Entries lacks; none when it is complete.
std::optional<Problem> incompleteReport(const Conditions& conditions) {
    const auto has = [&](std::string_view column, _IntfOper op) {
        return std::any_of(conditions.begin(), conditions.end(), [&](const Condition& condition) {
            return condition.column == column && condition.op == op;
        });
    };
    if (!has("LOGPATH", INTF_EQUAL) && !has("ULOGPATH", INTF_EQUAL)) {
        return bad("name the log's directory: LOGPATH or ULOGPATH with =", "filters");
    }
    if (!has("LOGNAME", INTF_EQUAL) && !has("ULOGNAME", INTF_EQUAL)) {
        return bad("name the log: LOGNAME or ULOGNAME with =", "filters");
    }
    if (!has("ENTRYTIME", INTF_GREATER_OR_EQUAL) || !has("ENTRYTIME", INTF_LESS_OR_EQUAL)) {
        return bad("give the time window: ENTRYTIME with >= and with <=", "filters");
    }
    return std::nullopt;
}

Conditions parseFilters(std::string_view table, std::string_view body) {
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
        auto condition =
            readFilter(builder, filters[index], fields.place("filters", index), budget);
        if (auto* const problem = std::get_if<Problem>(&condition)) {
            throw RequestRefused(std::move(*problem));
        }
        conditions.push_back(std::move(std::get<Condition>(condition)));
    }
    if (table == "RMLOGENT") {
        if (std::optional<Problem> problem = incompleteReport(conditions)) {
            throw RequestRefused(std::move(*problem));
        }
    }
    return conditions;
}

} // namespace

std::variant<Conditions, Problem> SampleRequest::parse(std::string_view table,
                                                       std::string_view body) {
    try {
        return parseFilters(table, body);
    } catch (const RequestRefused& refused) {
        return refused.problem();
    }
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
