#include "host/api/SampleSource.h"

#include "base/ProcessValues.h"
#include "base/TraceScope.h"
#include "host/events/RowJson.h"
#include "host/framework/Sample.h"
#include "host/http/RequestRefused.h"
#include "monitor/ReportOutcome.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <iterator>
#include <optional>
#include <semaphore>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"SampleSource.cpp"};

/// True for the conditions that name a log, in either table.
bool namesLog(const Condition& condition) {
    constexpr std::array columns = {"LOGPATH", "LOGNAME", "ULOGPATH", "ULOGNAME"};
    return std::find(columns.begin(), columns.end(), condition.column) != columns.end();
}

} // namespace

std::string SampleSource::Rows::reachJson() const {
    std::string text = reason.empty() ? "\"complete\":true" : "\"complete\":false";
    text += ",\"reached\":";
    reached.empty() ? void(text += "null") : RowJson::appendText(text, reached);
    text += ",\"reason\":";
    reason.empty() ? void(text += "null") : RowJson::appendText(text, reason);
    return text;
}

bool SampleSource::isMonitored(const std::vector<Condition>& report) {
    std::vector<Condition> log;
    std::copy_if(report.begin(), report.end(), std::back_inserter(log), namesLog);
    return take("RMMONLOG", log).count > 0;
}

namespace {

constexpr int mostReports = 4; ///< concurrent reports: each may keep a disk and a processor busy
std::counting_semaphore<mostReports> reportRoom{mostReports};

/// One running report while it exists.
class Room {
public:
    explicit Room(bool isReport) : m_isReport(isReport) {
        if (isReport && !reportRoom.try_acquire()) {
            throw RequestRefused(503, "four reports are already running: try again", "");
        }
    }
    ~Room() {
        if (m_isReport) {
            reportRoom.release();
        }
    }
    Room(const Room&) = delete;
    Room& operator=(const Room&) = delete;

private:
    const bool m_isReport;
};

} // namespace

SampleSource::Rows TableSampler::take(std::string_view table,
                                      const std::vector<Condition>& conditions) {
    TraceScope trace(anchor);
    const Room room(table == "RMLOGENT");
    const ReportOutcome outcome;
    const std::optional<Sample> sample = Sample::take(table, conditions, "HTTP");
    Rows rows;
    rows.json = "[";
    if (sample) {
        for (; rows.count < sample->size(); ++rows.count) {
            rows.json += rows.count == 0 ? "" : ",";
            RowJson::append(rows.json, sample->layout(), sample->row(rows.count));
        }
    }
    rows.json += ']';
    // The agent counts the rows that it reads, before the conditions.
    rows.truncated =
        sample && table == "RMLOGENT" && sample->offered() >= static_cast<std::uint64_t>(gMaxRows);
    if (!sample) {
        rows.reason = "the agent cannot take any more requests";
    } else if (!outcome.isComplete()) {
        rows.reason = outcome.reason();
    }
    rows.reached = outcome.reached();
    return rows;
}

} // namespace zrm::host
