// The report part of a Log Entries request: which log, which time window, and the rows.

#include "base/ProcessValues.h"
#include "base/TraceScope.h"
#include "base/UTF8Conv.h"
#include "framework/values.h"
#include "logmgr/LogManager.h"
#include "monitor/LogFile.h"
#include "monitor/ReportOutcome.h"
#include "tables/zrm_rmlogent_agent.h"

#include <algorithm>
#include <cstdio>
#include <cstring>
#include <new>

namespace zrm {

namespace {

TRC1_Anchor anchor{"zrm_rmlogent_report.cpp"};

/// Room for a UTF-8 column converted to the local code page, including its terminator.
constexpr std::size_t pathRoom = 1153;
constexpr std::size_t nameRoom = 385;

/// A column that names a part of the report's log.
struct NamePart {
    const char* column;
    bool isPath; ///< else the name
    bool isUTF8;
    int width; ///< maximum bytes taken from a column in the local code page
};

constexpr NamePart nameParts[] = {
    {"LOGPATH", true, false, sizeof(zrm_rmlogent_data_t::logpath)},
    {"ULOGPATH", true, true, 0},
    {"LOGNAME", false, false, sizeof(zrm_rmlogent_data_t::logname)},
    {"ULOGNAME", false, true, 0},
};

const NamePart* namePartOf(const char* column) {
    const auto* const found = std::ranges::find_if(
        nameParts, [&](const NamePart& part) { return std::strcmp(part.column, column) == 0; });
    return found != std::end(nameParts) ? found : nullptr;
}

void takeName(const NamePart& part, const SEL1_FILTERINFO& filter, char* text, std::size_t room) {
    const int length = std::max<int>(filter.valueLength, 0);
    if (part.isUTF8) {
        UTF8Conv::Convert_fromUTF8(text, room, filter.value, static_cast<std::size_t>(length));
    } else {
        AGF_CopyUnpad(text, filter.value, std::min(length, part.width));
    }
}

} // namespace

void zrm_rmlogent_agent::TakeSample() {
    const TraceScope trace(anchor);
    const int batch = std::min(static_cast<int>(allocSize), gMaxRows);
    count = 0;
    if (pTheLogManager == nullptr) {
        trace.error()("Log Manager not found. Request terminating.");
        ReportOutcome::note(ReportEnd::notRead);
        return;
    }
    logFile = validateFileName();
    if (logFile == nullptr) {
        trace.error()("A valid file name was not found.  Request terminating.");
        ReportOutcome::note(ReportEnd::notRead);
        return;
    }
    reportRows.reset(new (std::nothrow) zrm_rmlogent_data_t[static_cast<std::size_t>(batch)]());
    if (!reportRows) {
        trace.error()("Memory allocation for %d bytes failed. Request terminating.",
                      batch * static_cast<int>(sizeof(zrm_rmlogent_data_t)));
        ReportOutcome::note(ReportEnd::notRead);
        return;
    }
    if (!getEntrytimeThresholds()) {
        ReportOutcome::note(ReportEnd::notRead);
        return; // the next sample replaces the rows
    }
    reportHandle = logFile->startReportRequest(&thresholds);
    if (reportHandle != nullptr) {
        insertReportRows(batch);
        logFile->endReportRequest(&reportHandle);
    } else {
        ReportOutcome::note(ReportEnd::notRead);
    }
    reportRows.reset();
}

/// Reads and inserts the report's rows, `batch` at a time, up to the row limit.
void zrm_rmlogent_agent::insertReportRows(int batch) {
    const TraceScope trace(anchor);
    int total = 0;
    while (const int read = getLogEntries(batch)) {
        zrm_rmlogent_base::AddData(reportRows.get(), read);
        if (read < batch) {
            return; // the log has no more entries
        }
        total += read;
        if (total >= gMaxRows) {
            ReportOutcome::note(ReportEnd::rowLimit);
            trace.detail()("Maximum report row limit of %d reached. Request terminating.",
                           gMaxRows);
            return;
        }
        batch = std::min(batch, gMaxRows - total);
    }
}

int zrm_rmlogent_agent::getLogEntries(long maxRows) {
    TraceScope trace(anchor);
    int filled = 0;
    while (filled < maxRows &&
           logFile->getNextLogEntry(&reportRows[static_cast<std::size_t>(filled)], reportHandle,
                                    &thresholds) != nullptr) {
        ++filled;
    }
    if (filled > 0) {
        ReportOutcome::noteReached(reportRows[static_cast<std::size_t>(filled - 1)].entrytime);
    }
    return trace.result(filled);
}

LogFile* zrm_rmlogent_agent::validateFileName() {
    TraceScope trace(anchor);
    char path[pathRoom] = "";
    char name[nameRoom] = "";
    ResetFilterIndex();
    SEL1_FILTERINFO* filter = nullptr;
    while ((*path == '\0' || *name == '\0') && GetFilterInfo(&filter) == 0) {
        const NamePart* const part = namePartOf(filter->columnName);
        if (part == nullptr) {
            continue;
        }
        char* const text = part->isPath ? path : name;
        if (*text == '\0') {
            takeName(*part, *filter, text, part->isPath ? sizeof path : sizeof name);
        }
    }
    *path != '\0' ? trace.detail()("Log path = %s.", path) : trace.detail()("Log path is null.");
    *name != '\0' ? trace.detail()("Log name = %s.", name) : trace.detail()("Log name is null.");
    if (*path == '\0' || *name == '\0') {
        return trace.result<LogFile*>(nullptr);
    }
    char joined[pathRoom + nameRoom];
    std::snprintf(joined, sizeof joined, "%s%s", path, name);
    LogManager* const logManager = pTheLogManager;
    LogFile* const found = logManager->findLogObject(joined);
    if (found == nullptr) {
        trace.error()("Log file %s is not being monitored.", joined);
    }
    return trace.result(found);
}

bool zrm_rmlogent_agent::getEntrytimeThresholds() {
    TraceScope trace(anchor);
    constexpr int stampLength = sizeof thresholds.startTime - 1;
    ResetFilterIndex();
    SEL1_FILTERINFO* filter = nullptr;
    bool isComplete = false;
    while (!isComplete && GetFilterInfo(&filter) == 0) {
        trace.detail()("Filter column name  = %s.", filter->columnName);
        if (std::strcmp(filter->columnName, "ENTRYTIME") != 0) {
            continue;
        }
        if (filter->valueLength < 0 || filter->valueLength > stampLength) {
            trace.error()("Invalid %s threshold; value length is %d. Threshold ignored.",
                          filter->columnName, filter->valueLength);
        } else if (filter->compareOperator == INTF_GREATER_OR_EQUAL) {
            AGF_CopyUnpad(thresholds.startTime, filter->value, stampLength);
            trace.detail()("Report start time = %s.", thresholds.startTime);
            isComplete = *thresholds.endTime != '\0';
        } else if (filter->compareOperator == INTF_LESS_OR_EQUAL) {
            AGF_CopyUnpad(thresholds.endTime, filter->value, stampLength);
            trace.detail()("Report end time = %s.", thresholds.endTime);
            isComplete = *thresholds.startTime != '\0';
        } else {
            trace.error()("Invalid %s compare operator; value is %d. Threshold ignored.",
                          filter->columnName, filter->compareOperator);
        }
    }
    if (*thresholds.startTime == '\0' || *thresholds.endTime == '\0') {
        trace.error()("Report start and/or end time missing. Terminating request.");
        return trace.result(false);
    }
    trace.detail()("Request start time = %s; request end time = %s.", thresholds.startTime,
                   thresholds.endTime);
    return trace.result(true);
}

} // namespace zrm
