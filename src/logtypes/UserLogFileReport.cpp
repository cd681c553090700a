#include "logtypes/UserLogFile.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"
#include "logs/RequestThresholds.h"
#include "logs/zrm_rmlogent_data.h"
#include "logtypes/EntryTime.h"
#include "monitor/ReportOutcome.h"

#include <algorithm>
#include <cerrno>
#include <cstring>
#include <new>

namespace zrm {

namespace {

TRC1_Anchor anchor{"UserLogFileReport.cpp"};

constexpr std::int64_t longestLine = 2047; ///< monitoring reads lines in pieces of this size
constexpr int mostErrors = 10;             ///< bad lines in a row

} // namespace

void* UserLogFile::startReportRequest(void* /*request*/) {
    TraceScope trace(anchor);
    if (!hasFormat()) {
        trace.error()(
            "Error: StringParser anchor missing for file %s. Report request terminating. ",
            fileNameLocal());
        return trace.result(static_cast<void*>(nullptr));
    }
    UserlogBufferInfo* info = nullptr;
    if ((OptimumBlockSize == 0 && determineOptimumBlockSize() != 0) ||
        !allocateReportBuffers(&info) || openLogForReport(info) < 0) {
        deallocateReportBuffers(&info);
        return trace.result(static_cast<void*>(nullptr));
    }
    info->bufferCount = 0;
    info->pBuffer[info->blockSize] = '\0';
    if (!setDateContext(*info)) {
        closeLogForReport(info->fd);
        deallocateReportBuffers(&info);
        return trace.result(static_cast<void*>(nullptr));
    }
    trace.detail()("Read buffer of size %ld allocated for file %s.",
                   static_cast<long>(info->blockSize), fileNameLocal());
    return trace.result(static_cast<void*>(info));
}

bool UserLogFile::allocateReportBuffers(UserlogBufferInfo** bufferInfo) {
    TraceScope trace(anchor);
    auto* const info = new (std::nothrow) UserlogBufferInfo{};
    *bufferInfo = info;
    if (info == nullptr) {
        trace.error()("Memory allocation of %d bytes failed.",
                      static_cast<int>(sizeof(UserlogBufferInfo)));
        return trace.result(false);
    }
    info->fd = -1;
    info->blockSize = OptimumBlockSize;
    info->block.reset(new (std::nothrow) char[static_cast<std::size_t>(info->blockSize) + 1]);
    info->pBuffer = info->block.get();
    if (info->pBuffer == nullptr) {
        trace.error()("Memory allocation of %d bytes failed.",
                      static_cast<int>(info->blockSize + 1));
        return trace.result(false);
    }
    return trace.result(true);
}

/// Sets today as the date for the newest entries of a log without years. Returns false, with a
/// message, if the clock cannot be read.
bool UserLogFile::setDateContext(UserlogBufferInfo& info) const {
    TraceScope trace(anchor);
    EntryTime date;
    if (!EntryTime::today(date)) {
        const ErrorText error(errno);
        trace.error()("Error: unable to determine current time to complete event entrytime. errno "
                      "= %d; %s.",
                      error.number(), error.text());
        return trace.result(false);
    }
    info.century = date.century;
    info.year = date.year;
    info.month = date.month;
    info.day = date.day;
    return trace.result(true);
}

void* UserLogFile::getNextLogEntry(void* row, void* bufferInfo, void* thresholds) {
    TraceScope trace(anchor);
    auto& info = *static_cast<UserlogBufferInfo*>(bufferInfo);
    const auto& window = *static_cast<const _RequestThresholds*>(thresholds);
    const auto* const columns = static_cast<const zrm_rmlogent_data_t*>(row);
    constexpr std::size_t stampLength = sizeof columns->entrytime;
    int errors = 0;
    while (char* const line = previousLine(info)) {
        if (formatEntryAsRow(line, row, &info) != 0) {
            if (++errors > mostErrors) {
                trace.error()("Error: more than %d consecutive errors have occurred while trying "
                              "to build report for log %s. Report request is terminating.",
                              mostErrors, fileNameLocal());
                ReportOutcome::note(ReportEnd::formatErrors);
                break;
            }
            continue;
        }
        errors = 0;
        if (std::strncmp(columns->entrytime, window.endTime, stampLength) > 0) {
            continue;
        }
        if (std::strncmp(columns->entrytime, window.startTime, stampLength) < 0) {
            ReportOutcome::note(columns->entrytime[0] == ' ' ? ReportEnd::noTime
                                                             : ReportEnd::complete);
            break;
        }
        return trace.result(row);
    }
    return trace.result(static_cast<void*>(nullptr));
}

/// Removes the last line from the unprocessed part and terminates it. Returns null if there is none
/// or the report cannot take it.
char* UserLogFile::previousLine(UserlogBufferInfo& info) {
    TraceScope trace(anchor);
    if (info.bufferCount < 1 && !refill(info)) {
        return trace.result(static_cast<char*>(nullptr));
    }
    // The search starts before the last character, because the line's own newline does not begin
    // it.
    std::int64_t position = info.bufferCount - 2;
    for (;;) {
        const std::int64_t tooFar = std::max<std::int64_t>(info.bufferCount - longestLine - 2, -1);
        while (position > tooFar && info.pBuffer[position] != '\n') {
            --position;
        }
        const std::int64_t length = info.bufferCount - position - 1;
        const bool isWhole = position >= 0 || info.bytesLeft < 1;
        if (length > longestLine) {
            return trace.result(endAtLongLine(info, longestLine + 1));
        }
        if (isWhole) {
            break;
        }
        if (length >= info.blockSize) {
            // If pushed back, it would fill the block again.
            return trace.result(endAtLongLine(info, info.blockSize));
        }
        if (!refill(info)) {
            return trace.result(static_cast<char*>(nullptr));
        }
        position = info.bufferCount - length - 1;
    }
    char* const line = info.pBuffer + position + 1;
    info.pBuffer[info.bufferCount] = '\0';
    info.bufferCount = position + 1;
    return trace.result(line);
}

/// Ends the report permanently at a line that it cannot take. Returns null.
char* UserLogFile::endAtLongLine(UserlogBufferInfo& info, std::int64_t limit) const {
    TraceScope trace(anchor);
    trace.error()("Line in file %s exceeds %d characters. Remaining contents ignored.",
                  fileNameLocal(), static_cast<int>(limit));
    ReportOutcome::note(ReportEnd::longLine);
    info.bufferCount = info.bytesLeft = 0;
    return nullptr;
}

/// Reads the block before the current one and appends the unprocessed part to it. Returns false if
/// there is none, which ends the report permanently.
bool UserLogFile::refill(UserlogBufferInfo& info) {
    TraceScope trace(anchor);
    if (fillReportBuffer(&info) > 0) {
        return trace.result(true);
    }
    info.bufferCount = info.bytesLeft = 0;
    return trace.result(false);
}

void UserLogFile::endReportRequest(void** bufferInfo) {
    TraceScope trace(anchor);
    auto* info = static_cast<UserlogBufferInfo*>(*bufferInfo);
    if (info != nullptr) {
        closeLogForReport(info->fd);
        deallocateReportBuffers(&info);
        *bufferInfo = nullptr;
    }
}

void UserLogFile::deallocateReportBuffers(UserlogBufferInfo** bufferInfo) {
    TraceScope trace(anchor);
    delete *bufferInfo;
    *bufferInfo = nullptr;
}

} // namespace zrm
