#include "host/http/SampleSource.h"

#include <algorithm>
#include <array>
#include <iterator>

namespace {

/// True for the conditions that name a log, in either table.
bool namesLog(const Condition& condition) {
    constexpr std::array columns = {"LOGPATH", "LOGNAME", "ULOGPATH", "ULOGNAME"};
    return std::find(columns.begin(), columns.end(), condition.column) != columns.end();
}

} // namespace

bool SampleSource::isMonitored(const std::vector<Condition>& report) {
    std::vector<Condition> log;
    std::copy_if(report.begin(), report.end(), std::back_inserter(log), namesLog);
    return take("RMMONLOG", log).count > 0;
}
