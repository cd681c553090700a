#include "tables/zrm_rmmonlog_agent.h"

#include "base/BrevanTime.h"
#include "base/ErrorText.h"
#include "base/ProcessValues.h"
#include "base/TraceScope.h"
#include "logmgr/LogManager.h"
#include "monitor/LogFile.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <new>
#include <string_view>

#include <sys/stat.h>

namespace zrm {

namespace {

TRC1_Anchor anchor{"zrm_rmmonlog_agent.cpp"};

/// Copies at most the column's width, without a terminator.
template <std::size_t width> void fillColumn(char (&column)[width], std::string_view text) {
    std::memcpy(column, text.data(), std::min(text.size(), width));
}

} // namespace

zrm_rmmonlog_agent::~zrm_rmmonlog_agent() {
    TakeSampleDestructor();
}

void zrm_rmmonlog_agent::TakeSampleConstructor() {
    const TraceScope trace(anchor);
    LogManager* const logManager = pTheLogManager;
    logManager->setServerUp();
}

void zrm_rmmonlog_agent::TakeSampleDestructor() {
    const TraceScope trace(anchor);
}

void zrm_rmmonlog_agent::TakeSample() {
    const TraceScope trace(anchor);
    count = 0;
    if (pTheLogManager == nullptr) {
        trace.error()("Log Manager not found. Request terminating.");
        return;
    }
    std::unique_ptr<zrm_rmmonlog_data_t[]> rows;
    if (const unsigned built = getMonitoredLogs(rows)) {
        AddData(rows.get(), static_cast<int>(built));
    }
}

/// Builds one row per monitored log and returns the number of rows.
unsigned zrm_rmmonlog_agent::getMonitoredLogs(std::unique_ptr<zrm_rmmonlog_data_t[]>& rows) {
    TraceScope trace(anchor);
    LogManager* const logManager = pTheLogManager;
    logManager->beginRequest();
    unsigned built = 0;
    const unsigned room = logManager->numLogs();
    if (room == 0) {
        trace.detail()("No logs are currently being monitored.");
    } else {
        rows.reset(new (std::nothrow) zrm_rmmonlog_data_t[room]);
        if (rows) {
            built = buildTableRows(rows.get(), room);
        } else {
            trace.error()("Memory allocation for %d bytes failed. Request terminating.",
                          static_cast<int>(room * sizeof(zrm_rmmonlog_data_t)));
        }
    }
    logManager->endRequest();
    return trace.result(built);
}

/// Fills at most `room` rows, one per log of the chain, and returns the number of rows.
unsigned zrm_rmmonlog_agent::buildTableRows(zrm_rmmonlog_data_t* rows, unsigned room) {
    TraceScope trace(anchor);
    LogManager* const logManager = pTheLogManager;
    unsigned built = 0;
    LogFile* log = nullptr;
    while ((log = logManager->getNextLogObject(log, built)) != nullptr) {
        if (built == room) {
            trace.error()("Data array size of %d exceeded. Request terminated.",
                          static_cast<int>(room));
            break;
        }
        buildTableRow(&rows[built], log);
        ++built;
    }
    return trace.result(built);
}

void zrm_rmmonlog_agent::buildTableRow(zrm_rmmonlog_data_t* row, LogFile* log) {
    const TraceScope trace(anchor);
    std::memset(row, ' ', sizeof *row);
    fillColumn(row->originnode, gSystemName != nullptr ? gSystemName : "");

    const std::string_view local = log->fileNameLocal();
    const std::string_view utf8 = log->fileNameUTF8();
    fillColumn(row->logpath, local.substr(0, log->pathLengthLocal()));
    fillColumn(row->logname, local.substr(std::min(log->pathLengthLocal(), local.size())));
    fillColumn(row->ulogpath, utf8.substr(0, log->pathLengthUTF8()));
    fillColumn(row->ulogname, utf8.substr(std::min(log->pathLengthUTF8(), utf8.size())));

    row->logtype[0] = log->type();
    row->debugmode[0] = log->debugMode();
    fillColumn(row->formatter, log->procedure());
    log->getMonitorStatus(row->monstatus, sizeof row->monstatus);
    BrevanTime::generateTimestamp(log->monitorStartStopTime(), row->montime);
    row->numevents = static_cast<std::int32_t>(log->numEvents());
    row->numerrors = static_cast<std::int32_t>(log->numFormatErrors());

    struct stat status;
    if (stat(log->fileNameLocal(), &status) == 0) {
        BrevanTime::generateTimestamp(status.st_mtime, row->logmoddate);
        row->logsize = static_cast<std::int32_t>(status.st_size);
    } else {
        const ErrorText error(errno);
        // A followed log may be without a file for a while; its ledger shows it.
        if (log->followSettings() == nullptr || error.number() != ENOENT) {
            trace.error()("stat() command failed for %s;  errno = %d; %s.", log->fileNameLocal(),
                          error.number(), error.text());
        }
        std::memset(row->logmoddate, '0', sizeof row->logmoddate);
        row->logsize = -1;
    }
    row->sampleno = 0;
    row->rowno = 0;
    BrevanTime::generateCurrentTimestamp(row->timestamp);
}

} // namespace zrm
