// Trials of syslog files of [[log]] tables, which need no format.

#include "base/TraceScope.h"
#include "host/config/TimeZones.h"
#include "host/diagnose/TrialLine.h"
#include "host/framework/TraceCapture.h"
#include "logs/FollowSettings.h"
#include "logs/ValidLog.h"
#include "logtypes/SysLogFile.h"
#include "logtypes/SyslogForms.h"

#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"SyslogTrial.cpp"};

constexpr std::size_t longestText = 2046; ///< of a line that is judged

/// A syslog file that is not monitored.
class TrialSyslog : public SysLogFile {
public:
    explicit TrialSyslog(const TableSettings& settings)
        : SysLogFile(*trialLine('S', settings), Unmonitored{}) {}
};

/// The parts of a line, with the columns that they feed.
std::vector<FormatTrial::Field> fieldsOf(std::string_view text, const SyslogTime& time) {
    std::vector<FormatTrial::Field> fields;
    const auto add = [&](std::string_view part, const char* name, const char* column) {
        if (!part.empty()) {
            const auto from = static_cast<std::size_t>(part.data() - text.data());
            fields.push_back(
                {from, from + part.size(), name, column, std::string(part), std::nullopt});
        }
    };
    if (time.hasTime) {
        const std::string_view before = text.substr(0, time.end);
        add(before.substr(0, before.find_last_not_of(' ') + 1), "time", "ENTRYTIME");
    }
    const SyslogParts parts = SyslogForms::split(text, time);
    add(parts.host, "system", "ENTRYSYS");
    add(parts.source, "source", "ENTRYSRC");
    add(parts.processId, "source", "ENTRYSRC");
    add(parts.description, "description", "ENTRYDESC");
    return fields;
}

FormatTrial::Line lineOf(TrialSyslog& log, std::string_view whole) {
    FormatTrial::Line line;
    line.line = whole.substr(0, longestText);
    const SyslogTime time = SyslogForms::recognise(line.line);
    const auto row = std::make_unique<zrm_rmlogent_data_t>();
    std::string text = line.line + '\n';
    log.formatEntryAsRow(text.data(), row.get(), nullptr);
    line.matched = time.form != SyslogTime::Form::none;
    line.fields = fieldsOf(line.line, time);
    line.row = entryTexts(*row);
    if (!line.matched) {
        line.reason = "The line is in no form that system loggers write: its entry has no time, "
                      "and all of it is the description.";
    }
    return line;
}

} // namespace

FormatTrial::Result FormatTrial::runSyslog(const std::vector<std::string>& lines,
                                           std::string_view log, const TableSettings& settings) {
    TraceScope trace(anchor);
    const TraceCapture quiet;
    TrialSyslog syslog(settings);
    Result result;
    result.accepted = true;
    result.table = tableText(log, "", settings->timezone);
    for (const std::string& line : lines) {
        result.lines.push_back(lineOf(syslog, line));
        result.matched += result.lines.back().matched ? 1 : 0;
    }
    return result;
}

std::optional<TableSettings> FormatTrial::settingsOf(const std::string& timezone) {
    FollowSettings settings;
    if (!timezone.empty()) {
        settings.timezone = timezone;
        settings.zone = TimeZones::offsetsOf(timezone);
        if (settings.zone.empty()) {
            return std::nullopt;
        }
    }
    return std::make_shared<const FollowSettings>(std::move(settings));
}

} // namespace zrm::host
