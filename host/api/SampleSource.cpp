#include "host/api/SampleSource.h"

#include "base/ProcessValues.h"
#include "base/TraceScope.h"
#include "host/api/ReportRoom.h"
#include "host/events/RowJson.h"
#include "host/framework/Sample.h"
#include "monitor/ReportOutcome.h"

#include <algorithm>
#include <array>
#include <cstdint>
#include <iterator>
#include <optional>
#include <utility>

namespace zrm::host {

namespace {

TRC1_Anchor anchor{"SampleSource.cpp"};

/// True for the conditions that name a log, in either table.
bool namesLog(const Condition& condition) {
    constexpr std::array columns = {"LOGPATH", "LOGNAME", "ULOGPATH", "ULOGNAME"};
    return std::find(columns.begin(), columns.end(), condition.column) != columns.end();
}

} // namespace

void SampleSource::Rows::write(JsonWriter& json) const {
    json.key("rows").raw(this->json);
    json.member("count", count).member("truncated", truncated);
    reach.write(json);
}

namespace {

std::string rowsOf(const Sample& sample) {
    const RowJson format(sample.layout());
    return JsonWriter::text([&](JsonWriter& json) {
        json.beginArray();
        for (std::size_t index = 0; index < sample.size(); ++index) {
            format.write(json, sample.row(index));
        }
        json.endArray();
    });
}

} // namespace

SampleSource::Rows TableSampler::take(std::string_view table,
                                      const std::vector<Condition>& conditions) {
    TraceScope trace(anchor);
    std::optional<ReportRoom> room;
    if (table == "RMLOGENT") {
        room.emplace();
    }
    const ReportOutcome outcome;
    const std::optional<Sample> sample = Sample::take(table, conditions, "HTTP");
    Rows rows;
    rows.count = sample ? sample->size() : 0;
    rows.json = sample ? rowsOf(*sample) : "[]";
    // The agent counts the rows that it reads, before the conditions.
    rows.truncated =
        sample && table == "RMLOGENT" && sample->offered() >= static_cast<std::uint64_t>(gMaxRows);
    if (!sample) {
        rows.reach.reason = "the agent cannot take any more requests";
    } else if (!outcome.isComplete()) {
        rows.reach.reason = outcome.reason();
    }
    rows.reach.reached = outcome.reached();
    return rows;
}

bool TableSampler::isMonitored(const std::vector<Condition>& report) {
    TraceScope trace(anchor);
    std::vector<Condition> log;
    std::copy_if(report.begin(), report.end(), std::back_inserter(log), namesLog);
    const std::optional<Sample> monitored = Sample::take("RMMONLOG", std::move(log), "HTTP");
    return monitored && monitored->size() > 0;
}

} // namespace zrm::host
