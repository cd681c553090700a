#include "host/metrics/LogMetrics.h"

#include "host/events/LogPath.h"
#include "host/events/RowText.h"
#include "host/framework/Sample.h"
#include "host/metrics/MetricText.h"

#include <cstdint>
#include <map>
#include <optional>
#include <string>

namespace {

struct LogState {
    std::int32_t entries = 0;
    std::int32_t errors = 0;
    std::int32_t size = -1;
    std::string status;
};

std::int32_t integer(const Sample& sample, std::size_t row, const char* name) {
    const RowColumn* const column = sample.layout().find(name);
    return column == nullptr ? 0 : column->integer(sample.row(row));
}

/// By path, so that no two have the same labels.
std::map<std::string, LogState> takeLogs() {
    std::map<std::string, LogState> logs;
    const std::optional<Sample> sample = Sample::take("RMMONLOG", {}, "metrics");
    for (std::size_t row = 0; sample && row < sample->size(); ++row) {
        LogState& log = logs[LogPath::of(sample->layout(), sample->row(row))];
        log.entries = integer(*sample, row, "NUMEVENTS");
        log.errors = integer(*sample, row, "NUMERRORS");
        log.size = integer(*sample, row, "LOGSIZE");
        if (const RowColumn* const status = sample->layout().find("MONSTATUS")) {
            std::string room;
            log.status = RowText::of(*status, sample->row(row), room);
        }
    }
    return logs;
}

} // namespace

void LogMetrics::collect(MetricText& text) {
    const std::map<std::string, LogState> logs = takeLogs();
    text.gauge("zrm_logs", "Number of monitored logs.");
    text.add(static_cast<double>(logs.size()));
    text.gauge("zrm_log_running", "1 while the log is being read, 0 in any other state.");
    for (const auto& [path, log] : logs) {
        text.add(log.status == "Running" ? 1.0 : 0.0, {{"log", path}});
    }
    text.gauge("zrm_log_state", "The state of the log's monitor, as a label.");
    for (const auto& [path, log] : logs) {
        text.add(1.0, {{"log", path}, {"state", log.status}});
    }
    text.counter("zrm_log_entries_total", "Entries that were read from the log.");
    for (const auto& [path, log] : logs) {
        text.add(static_cast<double>(log.entries), {{"log", path}});
    }
    text.counter("zrm_log_errors_total", "Errors of the log's monitor.");
    for (const auto& [path, log] : logs) {
        text.add(static_cast<double>(log.errors), {{"log", path}});
    }
    text.gauge("zrm_log_size_bytes", "Size of the log, where the system tells it.");
    for (const auto& [path, log] : logs) {
        if (log.size >= 0) {
            text.add(static_cast<double>(log.size), {{"log", path}});
        }
    }
}
