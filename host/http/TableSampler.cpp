#include "host/http/TableSampler.h"

#include "agent/TraceScope.h"
#include "agent/zrmmain.h"
#include "host/events/RowJson.h"
#include "host/framework/Sample.h"
#include "monitor/ReportOutcome.h"

#include <cstdint>
#include <optional>

namespace {

TRC1_Anchor anchor{"TableSampler.cpp"};

} // namespace

SampleSource::Rows TableSampler::take(std::string_view table,
                                      const std::vector<Condition>& conditions) {
    TraceScope trace(anchor);
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
        rows.reason = "the agent has as many requests as it can have";
    } else if (!outcome.isComplete()) {
        rows.reason = outcome.reason();
    }
    rows.reached = outcome.reached();
    return rows;
}
