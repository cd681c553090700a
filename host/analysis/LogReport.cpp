#include "host/analysis/LogReport.h"

#include "base/ProcessValues.h"
#include "framework/LogEntry.h"
#include "host/analysis/MonitoredLogs.h"
#include "host/events/FieldsJson.h"
#include "host/framework/RequestLimit.h"
#include "host/framework/Sample.h"
#include "host/framework/TraceCapture.h"
#include "logs/FollowSettings.h"
#include "logtypes/EntryReader.h"
#include "logtypes/SourceReport.h"
#include "monitor/LogFile.h"
#include "monitor/ReportOutcome.h"

#include <algorithm>
#include <chrono>
#include <optional>
#include <utility>

namespace zrm::host {

namespace {

constexpr const char* wasEnded = "the report was ended: it took too long, or the agent is stopping";
constexpr const char* enoughFound = "the report has found as many entries as it may";
/// A refresh waits for a sample.
constexpr std::chrono::seconds sampleLimit{32};

class FilteredRows : public FollowedReport::Receiver {
public:
    FilteredRows(EntryFilter& filter, const std::vector<std::string>& fields,
                 LogReport::Receiver& receiver)
        : m_filter(filter), m_fields(fields), m_receiver(receiver) {}

    bool meets(zrm_rmlogent_data_t& row) override { return m_filter.meets(row); }
    FollowedReport::Detail describe() override {
        LogEntry* const entry = LogEntry::ofThisThread;
        if (m_fields.empty() || entry == nullptr) {
            return {};
        }
        FieldsJson fields = FieldsJson::of(entry->fields(), m_fields, LogReport::mostFieldBytes);
        return {std::move(fields.text), fields.isCut};
    }
    void give(const zrm_rmlogent_data_t& row, const FollowedReport::Detail& fields) override {
        ++count;
        m_receiver.row(reinterpret_cast<const char*>(&row), fields);
    }
    void progress(std::int64_t read, std::int64_t total) override {
        m_receiver.progress(read, total);
    }

    std::size_t count = 0;

private:
    EntryFilter& m_filter;
    const std::vector<std::string>& m_fields;
    LogReport::Receiver& m_receiver;
};

} // namespace

std::string reasonOf(const FollowedReport& report) {
    if (report.isCancelled()) {
        return wasEnded;
    }
    for (const FollowedReport::File& file : report.files()) {
        if (!file.problem.empty()) {
            return "not all of " + file.path + " was read: " + file.problem;
        }
    }
    return report.isLimited() ? enoughFound : "";
}

std::string reasonOf(const SourceReport& report) {
    if (report.isCancelled()) {
        return wasEnded;
    }
    if (!report.problem().empty()) {
        return report.problem();
    }
    return report.isLimited() ? enoughFound : "";
}

std::unique_ptr<LogReport> LogReport::open(ReportQuery query, TableManager& entries) {
    const TraceSilence silence;
    const MonitoredLogs logs;
    const LogFile* const log = logs.find(query.log);
    if (log == nullptr) {
        return nullptr;
    }
    std::unique_ptr<LogReport> report(new LogReport(std::move(query), entries));
    if (log->isSource()) {
        report->m_source = std::make_unique<SourceReport>(
            *log, FollowedReport::Options{report->m_query.from, report->m_query.to,
                                          report->m_query.limit});
    } else if (log->followSettings() != nullptr) {
        report->m_path = log->fileNameLocal();
        report->m_settings = log->followSettings();
        report->m_reader = EntryReader::of(*log);
    }
    return report;
}

LogReport::LogReport(ReportQuery query, TableManager& entries)
    : m_query(std::move(query)), m_filter(m_query.where, entries) {}

LogReport::~LogReport() = default;

LogReport::Result LogReport::run(Receiver& receiver) {
    if (m_source != nullptr) {
        return runSource(receiver);
    }
    return m_reader != nullptr ? runFollowed(receiver) : runSample(receiver);
}

LogReport::Result LogReport::runSource(Receiver& receiver) {
    const TraceSilence silence; // a line that does not fit is counted, not traced
    FilteredRows rows(m_filter, m_query.fields, receiver);
    m_source->run(rows);
    return {rows.count,
            m_source->isLimited(),
            {m_source->reached(), reasonOf(*m_source)},
            m_source->skipped(),
            {}};
}

LogReport::Result LogReport::runFollowed(Receiver& receiver) {
    const TraceSilence silence; // a line that does not fit is counted, not traced
    FollowedReport report(
        m_path, *m_reader,
        {m_query.from, m_query.to, m_query.limit, m_settings->rotatedTo, m_settings->join.value});
    FilteredRows rows(m_filter, m_query.fields, receiver);
    report.run(rows);
    return {rows.count,
            report.isLimited(),
            {report.reached(), reasonOf(report)},
            report.skipped(),
            report.files()};
}

LogReport::Result LogReport::runSample(Receiver& receiver) const {
    Result result;
    RequestLimit* const outer = RequestLimit::current();
    RequestLimit limit(RequestLimit::Clock::now() + sampleLimit,
                       [outer] { return outer != nullptr && outer->isReached(); });
    const ReportOutcome outcome;
    const std::optional<Sample> sample = Sample::take("RMLOGENT", m_query.conditions, "HTTP");
    if (!sample) {
        result.reach.reason = "the agent cannot take any more requests";
        return result;
    }
    const bool wasLimitReached = limit.wasReached();
    result.count = std::min(sample->size(), m_query.limit);
    for (std::size_t index = 0; index < result.count; ++index) {
        receiver.row(sample->row(index), {});
    }
    // The agent counts the rows that it reads, before the conditions.
    result.isTruncated =
        sample->offered() >= static_cast<std::uint64_t>(gMaxRows) || sample->size() > m_query.limit;
    result.reach.reached = outcome.reached();
    if (wasLimitReached) {
        result.reach.reason = wasEnded;
    } else if (!outcome.isComplete()) {
        result.reach.reason = outcome.reason();
    } else if (result.isTruncated) {
        result.reach.reason = enoughFound;
    }
    return result;
}

} // namespace zrm::host
