#include "host/api/SampleSource.h"

#include "host/events/RowJson.h"

#include <algorithm>
#include <array>
#include <iterator>

namespace zrm::host {

namespace {

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

} // namespace zrm::host
