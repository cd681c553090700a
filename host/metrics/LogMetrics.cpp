#include "host/metrics/MetricSources.h"

#include "host/diagnose/LogLedgers.h"
#include "host/diagnose/LogWatch.h"
#include "host/diagnose/UnmonitoredLogs.h"
#include "host/events/RowText.h"
#include "host/framework/Sample.h"
#include "host/metrics/MetricText.h"
#include "monitor/DescriptorReserve.h"
#include "monitor/LogFile.h"

#include <cstdint>
#include <map>
#include <optional>
#include <string>
#include <vector>

#include <sys/stat.h>

namespace zrm::host {

namespace {

struct LogState {
    std::string status;
    std::optional<LogLedgerView> ledger; ///< none: a refresh has just stopped its monitoring
};
using Logs = std::map<std::string, LogState>; ///< by path, so that no two have the same labels

/// A count in the ledger of a log. The numbers in the table's rows have only 32 bits.
struct Count {
    const char* name;
    const char* help;
    std::int64_t LogLedgerView::*value;
};

constexpr Count counts[] = {
    {"zrm_log_read_bytes_total", "Bytes that were read from the log.", &LogLedgerView::bytesRead},
    {"zrm_log_lines_total", "Lines that were read from the log.", &LogLedgerView::lines},
    {"zrm_log_entries_total", "Entries among the lines of the log.", &LogLedgerView::rows},
    {"zrm_log_format_errors_total", "Lines of the log that did not match its format.",
     &LogLedgerView::formatErrors},
    {"zrm_log_entries_without_time_total", "Entries whose time could not be read.",
     &LogLedgerView::withoutTime},
    {"zrm_log_truncations_total", "How often the log was truncated.", &LogLedgerView::truncations},
    {"zrm_log_skipped_bytes_total", "Bytes that were not read because the log was truncated.",
     &LogLedgerView::skippedBytes},
    {"zrm_log_restarts_total", "How often the log's monitor was restarted.",
     &LogLedgerView::restarts},
};

/// The same of a log that is followed.
struct FollowNumber {
    const char* name;
    const char* help;
    std::int64_t FollowView::*value;
    bool isCounter;
};

constexpr FollowNumber followNumbers[] = {
    {"zrm_log_position_bytes", "Where the next entry of the log begins in its file.",
     &FollowView::position, false},
    {"zrm_log_behind_bytes", "Bytes of the log that are not read yet.", &FollowView::behind, false},
    {"zrm_log_generations_total", "Files of the log that were read.", &FollowView::generations,
     true},
    {"zrm_log_recovered_bytes_total",
     "Bytes that were read from a copy because a truncation removed them before.",
     &FollowView::recoveredBytes, true},
    {"zrm_log_lost_bytes_total", "Bytes that a truncation removed and that no copy holds.",
     &FollowView::lostBytes, true},
};

Logs takeLogs() {
    Logs logs;
    const std::optional<Sample> sample = Sample::take("RMMONLOG", {}, "metrics");
    for (std::size_t row = 0; sample && row < sample->size(); ++row) {
        LogState& log = logs[LogPath::of(sample->layout(), sample->row(row))];
        if (const RowColumn* const status = sample->layout().find("MONSTATUS")) {
            std::string room;
            log.status = RowText::of(*status, sample->row(row), room);
        }
    }
    for (LogLedgerView& ledger : LogLedgers::read()) {
        if (const auto log = logs.find(ledger.log); log != logs.end()) {
            log->second.ledger = std::move(ledger);
        }
    }
    return logs;
}

void collectStates(MetricText& text, const Logs& logs) {
    std::vector<UnmonitoredLogs::Log> unmonitored = UnmonitoredLogs::read().logs;
    // A refresh may happen between the two calls.
    std::erase_if(unmonitored,
                  [&](const UnmonitoredLogs::Log& log) { return logs.contains(log.log); });
    text.gauge("zrm_logs", "Number of monitored logs.");
    text.add(static_cast<double>(logs.size()));
    text.gauge("zrm_logs_unmonitored", "Number of configured logs that are not monitored.");
    text.add(static_cast<double>(unmonitored.size()));
    text.gauge("zrm_log_running", "1 while the log is being read, 0 in any other state.");
    for (const auto& [path, log] : logs) {
        text.add(log.status == "Running" ? 1.0 : 0.0, {{"log", path}});
    }
    for (const UnmonitoredLogs::Log& log : unmonitored) {
        text.add(0.0, {{"log", log.log}});
    }
    text.gauge("zrm_log_state", "The state of the log's monitor, as a label.");
    for (const auto& [path, log] : logs) {
        text.add(1.0, {{"log", path}, {"state", log.status}});
    }
    for (const UnmonitoredLogs::Log& log : unmonitored) {
        text.add(1.0, {{"log", log.log}, {"state", "Not monitored"}});
    }
}

void collectCounts(MetricText& text, const Logs& logs) {
    for (const Count& count : counts) {
        text.counter(count.name, count.help);
        for (const auto& [path, log] : logs) {
            if (log.ledger) {
                text.add(static_cast<double>((*log.ledger).*count.value), {{"log", path}});
            }
        }
    }
}

void collectFollowing(MetricText& text, const Logs& logs) {
    for (const FollowNumber& number : followNumbers) {
        if (number.isCounter) {
            text.counter(number.name, number.help);
        } else {
            text.gauge(number.name, number.help);
        }
        for (const auto& [path, log] : logs) {
            if (log.ledger && log.ledger->follow) {
                text.add(static_cast<double>((*log.ledger->follow).*number.value), {{"log", path}});
            }
        }
    }
}

void collectTimes(MetricText& text, const Logs& logs) {
    constexpr double milliseconds = 1000.0;
    text.gauge("zrm_log_last_entry_timestamp_seconds",
               "When entries were last read from the log, in seconds since 1970.");
    for (const auto& [path, log] : logs) {
        if (log.ledger && log.ledger->lastEntry) {
            text.add(static_cast<double>(*log.ledger->lastEntry) / milliseconds, {{"log", path}});
        }
    }
}

void collectWarnings(MetricText& text, const LogWatch& watch) {
    text.gauge("zrm_log_warning", "1 for each warning about a log that is monitored.");
    for (const auto& [log, warnings] : watch.all()) {
        for (const LogWarning& warning : warnings) {
            text.add(1.0, {{"log", log}, {"warning", warning.kind}});
        }
    }
}

void collectSizes(MetricText& text, const Logs& logs) {
    text.gauge("zrm_log_size_bytes", "Size of the log, if it is known.");
    for (const auto& [path, log] : logs) {
        struct stat status {};
        if (log.ledger && stat(log.ledger->file.c_str(), &status) == 0) {
            text.add(static_cast<double>(status.st_size), {{"log", path}});
        }
    }
}

} // namespace

void LogMetrics::collect(MetricText& text) {
    const Logs logs = takeLogs();
    collectStates(text, logs);
    collectCounts(text, logs);
    collectFollowing(text, logs);
    collectTimes(text, logs);
    collectSizes(text, logs);
    text.counter("zrm_debug_log_incomplete_records_total",
                 "Records that were not completely written to the debug log.");
    text.add(LogFile::incompleteDebugRecords());
    text.counter("zrm_logs_without_descriptor_total",
                 "How often a log could not be opened because no descriptor was free.");
    text.add(DescriptorReserve::failures());
    collectWarnings(text, m_watch);
}

} // namespace zrm::host
