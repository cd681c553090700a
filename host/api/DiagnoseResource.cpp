#include "host/api/DiagnoseResource.h"

#include "base/TraceScope.h"
#include "host/api/TrialLines.h"
#include "host/diagnose/ConfigCheck.h"
#include "host/diagnose/FormatTrial.h"
#include "host/diagnose/LogLedgers.h"
#include "host/diagnose/UnmonitoredLogs.h"
#include "host/http/JsonFields.h"
#include "host/http/RequestRefused.h"
#include "host/http/Router.h"
#include "host/sources/LogList.h"

#include <algorithm>
#include <cstdint>
#include <memory>
#include <optional>
#include <string>
#include <vector>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"DiagnoseResource.cpp"};

/// How the lines of a trial are judged.
struct TrialRules {
    bool isSyslog = false;
    TableSettings settings; ///< null: by the rules of the log configuration
};

/// The settings of a log of a [[log]] table; null for any other log.
TableSettings settingsOf(const std::optional<std::string>& log) {
    const std::shared_ptr<const FoundLogs> found = LogList::found();
    const auto one = std::find_if(found->logs.begin(), found->logs.end(),
                                  [&](const FurtherLog& each) { return each.name == log; });
    const std::vector<LogLedgerView> monitored =
        one == found->logs.end() ? std::vector<LogLedgerView>() : LogLedgers::read(*log);
    return monitored.empty() || !monitored[0].follow ? nullptr : one->settings;
}

TrialRules rulesOf(JsonFields& fields, const std::optional<std::string>& log) {
    const std::string type = fields.optionalText("type").value_or("text");
    if (type != "text" && type != "syslog") {
        fields.refuse("type", "write \"text\" or \"syslog\"");
    }
    const std::optional<std::string> rules = fields.optionalText("rules");
    if (rules && *rules != "log_config" && *rules != "table") {
        fields.refuse("rules", "write \"log_config\" or \"table\"");
    }
    const std::optional<std::string> timezone = fields.optionalText("timezone");
    TrialRules judged{type == "syslog", rules == "log_config" ? nullptr : settingsOf(log)};
    const bool isTable = rules.value_or("") == "table" || judged.isSyslog || timezone;
    if (isTable && rules == "log_config") {
        fields.refuse("rules", "only a [[log]] table has a timezone, or lines that need no format");
    }
    if (timezone || (isTable && !judged.settings)) {
        const auto settings = FormatTrial::settingsOf(timezone.value_or(""));
        if (!settings) {
            fields.refuse("timezone", "'" + *timezone + "' is not a time zone of this machine");
        }
        judged.settings = *settings;
    }
    return judged;
}

/// An answer contains what every directive reads from every line; this limits the total.
void refuseTooMuch(const JsonFields& fields, const std::string& format, std::string_view log,
                   const TableSettings& settings, const std::vector<std::string>& lines) {
    std::size_t pieces = 0;
    for (const std::string& line : lines) {
        pieces += settings ? 1 : FormatTrial::piecesOf(line);
    }
    const std::size_t directives = FormatTrial(format, log, settings).result().directives.size();
    if (pieces * directives > DiagnoseResource::mostValues) {
        fields.refuse(fields.has("last") ? "last" : "lines",
                      "try fewer lines: with " + std::to_string(directives) +
                          " directives there may be " +
                          std::to_string(DiagnoseResource::mostValues / directives) +
                          " pieces of up to 2047 bytes");
    }
}

/// The directories of the configured logs, monitored or not. The API reveals no file outside of
/// them.
ConfigCheck::Directories logDirectories() {
    ConfigCheck::Directories directories;
    const auto add = [&directories](const std::string& path) {
        if (path.starts_with('/')) {
            directories.insert(path.substr(0, path.rfind('/') + 1));
        }
    };
    for (const LogLedgerView& log : LogLedgers::read()) {
        add(log.log);
    }
    for (const UnmonitoredLogs::Log& log : UnmonitoredLogs::read().logs) {
        add(log.log);
    }
    return directories;
}

} // namespace

void DiagnoseResource::addRoutes(Router& router) {
    router.add("POST", "/api/v1/try", tryFormat);
    router.add("POST", "/api/v1/check", checkConfig);
}

HttpAnswer DiagnoseResource::tryFormat(const HttpRequest& request) {
    TraceScope trace(anchor);
    JsonFields fields(request.body);
    const std::optional<std::string> log = fields.optionalText("log");
    const TrialRules rules = rulesOf(fields, log);
    const std::string format = rules.isSyslog ? "" : fields.text("format");
    const auto last = fields.optionalNumber("last", 1, static_cast<std::int64_t>(TrialLines::most));
    const bool hasLines = fields.has("lines");
    std::vector<std::string> lines = TrialLines::given(fields);
    fields.refuseUnknown();
    if (hasLines && last) {
        fields.refuse("last", "write either lines, or log and last");
    }
    if (last && !log) {
        fields.refuse("log", "is missing: last counts the lines of a log");
    }
    if (last) {
        lines = TrialLines::ofLog(fields, *log, static_cast<std::size_t>(*last));
    }
    const bool isNamed = log && !log->empty();
    const std::string_view name = isNamed ? std::string_view(*log) : FormatTrial::someLog;
    if (rules.isSyslog) {
        return HttpAnswer::json(
            FormatTrial::json(FormatTrial::runSyslog(lines, name, rules.settings)));
    }
    refuseTooMuch(fields, format, name, rules.settings, lines);
    return HttpAnswer::json(
        FormatTrial::json(FormatTrial::run(format, lines, name, rules.settings)));
}

HttpAnswer DiagnoseResource::checkConfig(const HttpRequest& request) {
    TraceScope trace(anchor);
    JsonFields fields(request.body);
    const std::string config = fields.text("config");
    fields.refuseUnknown();
    if (static_cast<std::size_t>(std::count(config.begin(), config.end(), '\n')) >
        mostConfigLines) {
        fields.refuse("config", "write at most 10000 lines");
    }
    return HttpAnswer::json(ConfigCheck::json(ConfigCheck::check(config, logDirectories())));
}

} // namespace zrm::host
