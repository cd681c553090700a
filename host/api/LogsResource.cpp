#include "host/api/LogsResource.h"

#include "base/TraceScope.h"
#include "host/base/JsonWriter.h"
#include "host/base/TimeText.h"
#include "host/config/ConditionBuilder.h"
#include "host/diagnose/LogLedgers.h"
#include "host/diagnose/LogWatch.h"
#include "host/diagnose/UnmonitoredLogs.h"
#include "host/events/RowJson.h"
#include "host/events/RowText.h"
#include "host/framework/Sample.h"
#include "host/http/QueryFields.h"
#include "host/http/RequestRefused.h"
#include "host/http/Router.h"
#include "host/sources/FoundLogsJson.h"
#include "host/sources/LogList.h"

#include <algorithm>
#include <optional>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"LogsResource.cpp"};

std::vector<Condition> conditionsOf(const std::optional<std::string>& log) {
    if (!log) {
        return {};
    }
    auto conditions = ConditionBuilder::ofLog(*log);
    if (!conditions) {
        throw RequestRefused(400, {conditions.error().what, conditions.error().cure, "log"});
    }
    return std::move(*conditions);
}

/// The log's ledger; null when a refresh has just stopped its monitoring.
void writeLedger(JsonWriter& json, const std::vector<LogLedgerView>& ledgers, std::string_view log,
                 bool withSamples) {
    const auto ledger =
        std::find_if(ledgers.begin(), ledgers.end(),
                     [log](const LogLedgerView& candidate) { return candidate.log == log; });
    if (ledger == ledgers.end()) {
        json.null();
    } else {
        LogLedgers::write(json, *ledger, withSamples);
    }
}

void writeLogs(JsonWriter& json, const Sample& sample, const std::vector<LogLedgerView>& ledgers,
               bool withSamples) {
    const RowJson format(sample.layout());
    for (std::size_t index = 0; index < sample.size(); ++index) {
        const char* const row = sample.row(index);
        const std::string log = LogPath::of(sample.layout(), row);
        json.beginObject().member("log", log).key("row");
        format.write(json, row);
        json.key("ledger");
        writeLedger(json, ledgers, log, withSamples);
        json.endObject();
    }
}

/// What the [[log]] tables match.
std::string tables() {
    using Json = nlohmann::ordered_json;
    return foundLogsJson(*LogList::found()).dump(-1, ' ', false, Json::error_handler_t::replace);
}

/// The configured but unmonitored logs: all, or the one with this path.
std::vector<UnmonitoredLogs::Log> chosen(std::vector<UnmonitoredLogs::Log> logs,
                                         const std::optional<std::string>& log) {
    std::erase_if(logs, [&](const UnmonitoredLogs::Log& one) { return log && one.log != *log; });
    return logs;
}

} // namespace

HttpAnswer LogsResource::logs(const HttpRequest& request) {
    TraceScope trace(anchor);
    QueryFields query(request);
    const std::optional<std::string> log = query.text("log");
    query.refuseUnknown();
    const std::optional<Sample> sample = Sample::take("RMMONLOG", conditionsOf(log), "HTTP");
    const std::size_t count = sample ? sample->size() : 0;
    const UnmonitoredLogs::Result configured = UnmonitoredLogs::read();
    const std::vector<UnmonitoredLogs::Log> unmonitored = chosen(configured.logs, log);
    if (log && count == 0 && unmonitored.empty()) {
        throw RequestRefused(404, "the agent does not monitor this log", "log");
    }
    std::vector<LogLedgerView> ledgers = LogLedgers::read(log.value_or(""));
    for (LogLedgerView& ledger : ledgers) {
        ledger.warnings = m_watch.of(ledger.log);
    }
    return HttpAnswer::json(JsonWriter::text([&](JsonWriter& json) {
        json.beginObject().key("logs").beginArray();
        if (sample) {
            writeLogs(json, *sample, ledgers, log.has_value());
        }
        json.endArray().key("unmonitored").beginArray();
        for (const UnmonitoredLogs::Log& one : unmonitored) {
            one.write(json);
        }
        json.endArray().key("configuration");
        configured.writeConfiguration(json);
        json.key("tables").raw(log ? "[]" : tables());
        json.key("time").time(WallClock::now()).endObject();
    }));
}

void LogsResource::addRoutes(Router& router) {
    router.add("GET", "/api/v1/logs", [this](const HttpRequest& request) { return logs(request); });
}

} // namespace zrm::host
