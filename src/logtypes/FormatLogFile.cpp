#include "logtypes/FormatLogFile.h"

#include "base/BrevanTime.h"
#include "base/TraceScope.h"
#include "framework/LogEntry.h"
#include "logs/FollowSettings.h"
#include "logs/RequestThresholds.h"
#include "logs/ValidLog.h"
#include "logtypes/ColumnsRow.h"
#include "logtypes/EntryReader.h"
#include "monitor/BackwardBlock.h"
#include "monitor/Generation.h"
#include "monitor/ReportOutcome.h"

#include <cstring>

namespace zrm {

namespace {

TRC1_Anchor anchor{"FormatLogFile.cpp"};

/// The parser of the calling thread. A log's thread has one all its life; other threads have one
/// after another. It shares the settings, which may outlive the log so.
thread_local std::unique_ptr<FormatLogFile::Parser> threadParser;

} // namespace

/// Reads the present file backwards.
struct FormatLogFile::Report {
    std::unique_ptr<Generation> file;
    std::unique_ptr<EntryReader> entries;
    std::unique_ptr<BackwardBlock> block;
    char newest[EntryReader::stampLength];
};

FormatLogFile::FormatLogFile(const ValidLog& log, LogFile* chainHead) : LogFile(log, chainHead) {
    TraceScope trace(anchor);
    if (trace.isOn(TRC1_DETAIL)) {
        printSelf();
    }
    startThread();
}

FormatLogFile::FormatLogFile(const ValidLog& log, Unmonitored) : LogFile(log, nullptr) {
    const TraceScope trace(anchor);
}

FormatLogFile::~FormatLogFile() {
    TraceScope trace(anchor);
    stopThread();
}

void FormatLogFile::processLogData() {
    TraceScope trace(anchor);
    followLog(format().recordLength());
}

FormatLogFile::Parser& FormatLogFile::parserOfThread() const {
    if (!threadParser || threadParser->settings != followSettings()) {
        threadParser = std::make_unique<Parser>(followSettings());
    }
    return *threadParser;
}

/// The whole of an entry of which this is the beginning.
std::string_view FormatLogFile::wholeEntry(const char* entry) const {
    if (const std::size_t record = format().recordLength(); record != 0) {
        return {entry, record};
    }
    if (LogEntry::ofThisThread != nullptr) {
        return LogEntry::ofThisThread->text();
    }
    std::string_view line(entry);
    line.remove_suffix(line.ends_with('\n') ? 1 : 0);
    line.remove_suffix(line.ends_with('\r') ? 1 : 0);
    return line;
}

long FormatLogFile::formatEntryAsRow(char* entry, void* row, void* /*context*/) {
    TraceScope trace(anchor);
    const bool isRow = makeRow(parserOfThread(), wholeEntry(entry), nullptr,
                               *static_cast<zrm_rmlogent_data_t*>(row));
    return trace.result(isRow ? 0L : -1L);
}

bool FormatLogFile::makeRow(Parser& parser, std::string_view entry, const char* newest,
                            zrm_rmlogent_data_t& row) {
    TraceScope trace(anchor);
    EntryRow columns(*this, &row);
    EntryColumns found;
    if (!parser.reader->read(entry, found)) {
        columns.reject();
        return trace.result(false);
    }
    return trace.result(ColumnsRow::fill(columns, found, parser.stamp, newest));
}

bool FormatLogFile::deliverEntry(char* entry) {
    const std::size_t record = format().recordLength();
    if (record == 0) {
        return LogFile::deliverEntry(entry);
    }
    count(NumEvents);
    zrm_rmlogent_data_t* const row = ownRow();
    if (formatEntryAsRow(entry, row, nullptr) == 0) {
        if (!offer(row)) {
            return false;
        }
        writeToDebugLog(entry, record, row, sizeof *row);
    } else {
        count(NumFormatErrors);
        m_ledger.noteRejected("", rejectionReason()); // a record is not a text
        writeToDebugLog(entry, record, nullptr, 0);
    }
    return true;
}

void FormatLogFile::readFields(std::string_view text, EntryFields& fields) const {
    parserOfThread().reader->readFields(text, fields);
}

std::string_view FormatLogFile::rejectionReason() const noexcept {
    return threadParser ? threadParser->reader->reason() : std::string_view();
}

void* FormatLogFile::startReportRequest(void* /*thresholds*/) {
    TraceScope trace(anchor);
    auto report = std::make_unique<Report>();
    report->file = Generation::open(fileNameLocal());
    Generation::Status status{};
    if (!report->file || !report->file->status(status) || status.size == 0) {
        return trace.result(static_cast<void*>(nullptr));
    }
    report->entries = EntryReader::of(*this);
    report->block = std::make_unique<BackwardBlock>(format().recordLength(),
                                                    followSettings()->join.value.get());
    report->block->start(status.size);
    BrevanTime::generateCurrentTimestamp(report->newest);
    return trace.result(static_cast<void*>(report.release()));
}

void* FormatLogFile::getNextLogEntry(void* row, void* reportState, void* thresholds) {
    TraceScope trace(anchor);
    auto& report = *static_cast<Report*>(reportState);
    const auto& window = *static_cast<const _RequestThresholds*>(thresholds);
    auto& columns = *static_cast<zrm_rmlogent_data_t*>(row);
    constexpr std::size_t stampLength = sizeof columns.entrytime;
    for (;;) {
        char* const entry = report.block->next();
        if (entry == nullptr) {
            const BackwardBlock::Fill filled = report.block->fill(*report.file);
            if (filled != BackwardBlock::Fill::more) {
                ReportOutcome::note(filled == BackwardBlock::Fill::end ? ReportEnd::complete
                                                                       : ReportEnd::readError);
                return trace.result(static_cast<void*>(nullptr));
            }
            continue;
        }
        if (!report.entries->read(entry, report.block->text(), report.newest, columns) ||
            std::strncmp(columns.entrytime, window.endTime, stampLength) > 0) {
            continue;
        }
        if (std::strncmp(columns.entrytime, window.startTime, stampLength) < 0) {
            ReportOutcome::note(ReportEnd::complete);
            return trace.result(static_cast<void*>(nullptr));
        }
        std::memcpy(report.newest, columns.entrytime, stampLength);
        return trace.result(row);
    }
}

void FormatLogFile::endReportRequest(void** reportState) {
    TraceScope trace(anchor);
    delete static_cast<Report*>(*reportState);
    *reportState = nullptr;
}

} // namespace zrm
