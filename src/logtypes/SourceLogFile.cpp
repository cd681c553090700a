#include "logtypes/SourceLogFile.h"

#include "base/TraceScope.h"
#include "framework/LogPositions.h"
#include "framework/traceSilence.h"
#include "logs/FollowSettings.h"
#include "logs/RequestThresholds.h"
#include "logs/ValidLog.h"
#include "logtypes/ColumnsRow.h"
#include "logtypes/SourceEntry.h"
#include "logtypes/SourceReport.h"
#include "monitor/FollowLedger.h"
#include "monitor/ReportOutcome.h"

#include <cstring>
#include <memory>
#include <utility>

namespace zrm {

namespace {

TRC1_Anchor anchor{"SourceLogFile.cpp"};

constexpr std::chrono::seconds waitInterval{1};
constexpr std::chrono::seconds noteInterval{1};
constexpr std::chrono::seconds recountPatience{5};
constexpr unsigned entriesPerClock = 1024; ///< entries between two looks at the clock

} // namespace

SourceLogFile::SourceLogFile(const ValidLog& log, LogFile* chainHead) : LogFile(log, chainHead) {
    TraceScope trace(anchor);
    if (trace.isOn(TRC1_DETAIL)) {
        printSelf();
    }
    startThread();
}

SourceLogFile::SourceLogFile(const ValidLog& log, Unmonitored) : LogFile(log, nullptr) {
    const TraceScope trace(anchor);
}

SourceLogFile::~SourceLogFile() {
    TraceScope trace(anchor);
    stopThread();
}

void SourceLogFile::processLogData() {
    TraceScope trace(anchor);
    const FollowSettings& settings = *followSettings();
    LogPositions positions(fileNameUTF8());
    const std::unique_ptr<EntrySource::Reading> reading = settings.source->reading();
    m_reading = reading.get();
    SourceEntry current(*reading, settings.keep);
    const LogEntry::Offer offer(current);
    begin(settings, positions);
    for (bool isLast = false; !isLast;) {
        // What is there when the log is to end is still read.
        isLast = monitorStatus() != MONITOR_RUNNING;
        m_pulse.work("reads the log");
        positions.beginLook();
        if (!readEntries(positions, current)) {
            // Who follows the log next judges this entry, and none of those before it again.
            reach(positions, reading->takeBack());
            break;
        }
        reach(positions, reading->position());
        noteState();
        m_pulse.rest();
        if (!isLast) {
            positions.endLook();
            reading->wait(waitInterval);
        }
    }
    m_reading = nullptr;
    m_followLedger->setState(FollowLedger::State::waiting);
}

/// Begins at the stored position, or where the settings say.
void SourceLogFile::begin(const FollowSettings& settings, LogPositions& positions) {
    TraceScope trace(anchor);
    using Start = EntrySource::Reading::Start;
    // A log that is followed again, with other settings for example, continues in any case.
    const bool continues = settings.resume || !positions.isFirstOfRun();
    const auto stored = continues ? positions.stored() : std::nullopt;
    if (!stored || stored->cursor.empty()) {
        m_reading->startAt(settings.start == FollowSettings::Start::beginning ? Start::beginning
                                                                              : Start::end);
        return;
    }
    if (positions.isFirstOfRun()) {
        recount(stored->cursor);
    }
    m_reading->resumeAt(stored->cursor);
}

/// Counts the entries just before the position again, for the thresholds of situations.
void SourceLogFile::recount(const std::string& position) {
    TraceScope trace(anchor);
    const std::int64_t period = earlierPeriod();
    if (period == 0) {
        return;
    }
    const TRC1_Silence silence; // the earlier run has traced it
    const std::unique_ptr<EntrySource::Reading> earlier = followSettings()->source->reading();
    SourceEntry current(*earlier, followSettings()->keep);
    const LogEntry::Offer offer(current);
    const auto end = std::chrono::steady_clock::now() + recountPatience;
    earlier->recall(position, std::chrono::seconds(period));
    for (unsigned entries = 1; earlier->next() != nullptr; ++entries) {
        current.begin();
        if (makeRow(*earlier, m_stamp, *ownRow())) {
            countEarlier(*ownRow());
        }
        if (monitorStatus() != MONITOR_RUNNING ||
            (entries % entriesPerClock == 0 && std::chrono::steady_clock::now() >= end)) {
            return;
        }
    }
}

/// Judges what there is to read. False if the log has to end before an entry was judged, which then
/// is not behind the position.
bool SourceLogFile::readEntries(LogPositions& positions, SourceEntry& current) {
    TraceScope trace(anchor);
    const std::int64_t entriesBefore = numEvents();
    auto noted = std::chrono::steady_clock::now();
    std::int64_t bytes = 0;
    bool isJudged = true;
    for (unsigned entries = 1; isJudged; ++entries) {
        char* const entry = m_reading->next();
        if (entry == nullptr) {
            break;
        }
        current.begin();
        positions.beginEntry();
        bytes += static_cast<std::int64_t>(m_reading->text().size());
        isJudged = !isReadingOver() && deliverEntry(entry);
        if (isJudged && positions.hasEvents()) {
            positions.endEntry({.cursor = m_reading->position()});
        }
        if (isJudged && entries % entriesPerClock == 0 &&
            std::chrono::steady_clock::now() - noted >= noteInterval) {
            noted = std::chrono::steady_clock::now();
            reach(positions, m_reading->position());
            m_ledger.addBytes(std::exchange(bytes, 0));
        }
    }
    m_ledger.addBytes(bytes);
    if (numEvents() != entriesBefore) {
        m_ledger.noteEntries();
    }
    return trace.result(isJudged);
}

/// Records how far the source was read, if it has positions.
void SourceLogFile::reach(LogPositions& positions, std::string position) {
    if (!position.empty()) {
        positions.reached({.cursor = std::move(position)});
    }
}

/// Records and traces what is wrong with the source, each problem once, and its end.
void SourceLogFile::noteState() {
    TraceScope trace(anchor);
    while (const std::optional<EntrySource::Remark> remark = m_reading->takeRemark()) {
        if (remark->isLoss) {
            m_followLedger->noteLost(remark->text);
        }
        trace.error()("Log %s: %s", fileNameLocal(), remark->text.c_str());
    }
    const std::string& problem = m_reading->problem();
    m_followLedger->setState(problem.empty() ? FollowLedger::State::reading
                                             : FollowLedger::State::waiting);
    if (problem == m_problem) {
        return;
    }
    if (problem.empty()) {
        m_followLedger->clearFailure();
        trace.error()("Log %s is read again.", fileNameLocal());
    } else {
        m_followLedger->noteProblem(problem);
        trace.error()("Error while reading log %s: %s.", fileNameLocal(), problem.c_str());
    }
    m_problem = problem;
}

bool SourceLogFile::makeRow(EntrySource::Entry& entry, EntryStamp& stamp,
                            zrm_rmlogent_data_t& row) {
    TraceScope trace(anchor);
    EntryRow columns(*this, &row);
    EntryColumns found;
    if (!entry.read(found)) {
        columns.reject();
        return trace.result(false);
    }
    return trace.result(ColumnsRow::fill(columns, found, stamp, nullptr));
}

std::string_view SourceLogFile::rejectionReason() const noexcept {
    return m_reading == nullptr ? std::string_view() : m_reading->reason();
}

/// Reads the source backwards.
struct SourceLogFile::Report {
    std::unique_ptr<EntrySource::Past> past;
    EntryStamp stamp;
};

void* SourceLogFile::startReportRequest(void* thresholds) {
    TraceScope trace(anchor);
    const auto& window = *static_cast<const _RequestThresholds*>(thresholds);
    std::unique_ptr<Report> report(
        new Report{followSettings()->source->past(), EntryStamp(followSettings())});
    if (!report->past || !report->past->begin(SourceReport::latestOf(window.endTime))) {
        return trace.result(static_cast<void*>(nullptr));
    }
    return trace.result(static_cast<void*>(report.release()));
}

void* SourceLogFile::getNextLogEntry(void* row, void* reportState, void* thresholds) {
    TraceScope trace(anchor);
    auto& report = *static_cast<Report*>(reportState);
    EntrySource::Past& past = *report.past;
    const auto& window = *static_cast<const _RequestThresholds*>(thresholds);
    auto& columns = *static_cast<zrm_rmlogent_data_t*>(row);
    constexpr std::size_t stampLength = sizeof columns.entrytime;
    while (past.previous() != nullptr) {
        if (!makeRow(past, report.stamp, columns) ||
            std::strncmp(columns.entrytime, window.endTime, stampLength) > 0) {
            continue;
        }
        if (std::strncmp(columns.entrytime, window.startTime, stampLength) < 0) {
            break;
        }
        return trace.result(row);
    }
    ReportOutcome::note(past.problem().empty() ? ReportEnd::complete : ReportEnd::readError);
    return trace.result(static_cast<void*>(nullptr));
}

void SourceLogFile::endReportRequest(void** reportState) {
    TraceScope trace(anchor);
    delete static_cast<Report*>(*reportState);
    *reportState = nullptr;
}

long SourceLogFile::formatEntryAsRow(char* /*entry*/, void* row, void* /*context*/) {
    TraceScope trace(anchor);
    return trace.result(
        makeRow(*m_reading, m_stamp, *static_cast<zrm_rmlogent_data_t*>(row)) ? 0L : -1L);
}

} // namespace zrm
