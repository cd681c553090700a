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
#include "host/sources/LogList.h"

#include <algorithm>
#include <memory>
#include <optional>
#include <set>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

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

/// The [[log]] tables: all, or those that name or match the log with this path.
std::vector<FoundLogs::Source> tablesOf(const std::optional<std::string>& log) {
    const std::shared_ptr<const FoundLogs> found = LogList::found();
    if (found->sources.empty()) {
        return {};
    }
    std::set<std::string> configured;
    for (const LogLedgerView& ledger : LogLedgers::read()) {
        if (!ledger.follow) {
            configured.insert(ledger.log);
        }
    }
    std::vector<FoundLogs::Source> tables = found->sourcesBeside(configured);
    std::erase_if(tables,
                  [&](const FoundLogs::Source& table) { return log && !table.mentions(*log); });
    return tables;
}

/// Why a log that was asked for is not there.
std::string absence(const std::string& log, const std::vector<FoundLogs::Source>& tables) {
    std::string text = "the agent does not monitor this log";
    for (const FoundLogs::Source& table : tables) {
        for (const FoundLogs::PassedOver& one : table.passedOver) {
            if (one.file == log) {
                text += "; the [[log]] at line " + std::to_string(table.line) +
                        " passes over it: " + one.reason;
            }
        }
    }
    return text;
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
    std::vector<LogLedgerView> ledgers = LogLedgers::read(log.value_or(""));
    const std::vector<FoundLogs::Source> tables = tablesOf(log);
    if (log && count == 0 && unmonitored.empty()) {
        throw RequestRefused(404, absence(*log, tables), "log");
    }
    for (LogLedgerView& ledger : ledgers) {
        ledger.warnings = m_watch.of(ledger.log);
        ledger.health = m_watch.healthOf(ledger.log);
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
        json.key("tables").beginArray();
        for (const FoundLogs::Source& table : tables) {
            table.write(json);
        }
        json.endArray().key("time").time(WallClock::now()).endObject();
    }));
}

void LogsResource::addRoutes(Router& router) {
    router.add("GET", "/api/v1/logs", [this](const HttpRequest& request) { return logs(request); });
}

} // namespace zrm::host
