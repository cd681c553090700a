#include "host/api/LogsResource.h"

#include "base/TraceScope.h"
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

#include <chrono>
#include <optional>
#include <string>
#include <utility>
#include <vector>

#include <nlohmann/json.hpp>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"LogsResource.cpp"};

std::string now() {
    return UtcTime::text(std::chrono::duration_cast<std::chrono::milliseconds>(
                             std::chrono::system_clock::now().time_since_epoch())
                             .count());
}

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
std::string ledgerOf(const std::vector<LogLedgerView>& ledgers, const std::string& log,
                     bool withSamples) {
    for (const LogLedgerView& ledger : ledgers) {
        if (ledger.log == log) {
            return LogLedgers::json(ledger, withSamples);
        }
    }
    return "null";
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
    std::string text = "{\"logs\":[";
    for (std::size_t index = 0; index < count; ++index) {
        text += index == 0 ? "{\"log\":" : ",{\"log\":";
        RowJson::appendText(text, LogPath::of(sample->layout(), sample->row(index)));
        text += ",\"row\":";
        RowJson::append(text, sample->layout(), sample->row(index));
        text +=
            ",\"ledger\":" +
            ledgerOf(ledgers, LogPath::of(sample->layout(), sample->row(index)), log.has_value());
        text += '}';
    }
    text += "],\"unmonitored\":[";
    for (std::size_t index = 0; index < unmonitored.size(); ++index) {
        text += (index == 0 ? "" : ",") + UnmonitoredLogs::json(unmonitored[index]);
    }
    return HttpAnswer::json(
        text + "],\"configuration\":" + UnmonitoredLogs::configurationJson(configured) +
        ",\"tables\":" + (log ? "[]" : tables()) + ",\"time\":\"" + now() + "\"}");
}

void LogsResource::addRoutes(Router& router) {
    router.add("GET", "/api/v1/logs", [this](const HttpRequest& request) { return logs(request); });
}

} // namespace zrm::host
