#include "logtypes/AdminLogFile.h"

#include "base/TraceScope.h"
#include "framework/cancellation.h"
#include "logs/RequestThresholds.h"
#include "logs/zrm_rmlogent_data.h"
#include "monitor/ReportOutcome.h"

#include <algorithm>
#include <cstring>
#include <new>

namespace zrm {

namespace {

TRC1_Anchor anchor{"AdminLogFileReport.cpp"};

constexpr auto length = static_cast<std::int64_t>(AdminLogFile::recordLength);
constexpr int statedStateLength = 32; // size of a report's state in the message about its failure

/// Compares 16-character time stamps.
int compareTimes(const char* left, const char* right) {
    return std::memcmp(left, right, sizeof zrm_rmlogent_data_t::entrytime);
}

} // namespace

void* AdminLogFile::startReportRequest(void* /*thresholds*/) {
    TraceScope trace(anchor);
    _LogBufferInfo* info = nullptr;
    if (!allocateReportBuffers(&info) || openLogForReport(info) < 0) {
        deallocateReportBuffers(&info);
        return trace.result(static_cast<void*>(nullptr));
    }
    info->bufferCount = 0;
    if (info->bytesLeft % length != 0) {
        // Such a file, read from its end, does not return any record as it was written.
        ReportOutcome::note(ReportEnd::brokenRecord);
    }
    trace.detail()("Read buffer of size %ld allocated for file %s.",
                   static_cast<long>(OptimumBlockSize), fileNameLocal());
    return trace.result(static_cast<void*>(info));
}

bool AdminLogFile::allocateReportBuffers(_LogBufferInfo** reportState) {
    TraceScope trace(anchor);
    if (OptimumBlockSize == 0) {
        if (determineOptimumBlockSize() != 0) {
            return trace.result(false);
        }
        if (OptimumBlockSize <= length) {
            OptimumBlockSize = length;
        }
    }
    auto* const info = new (std::nothrow) _LogBufferInfo{};
    if (info == nullptr) {
        trace.error()("Memory allocation of %d bytes failed.", statedStateLength);
        return trace.result(false);
    }
    *reportState = info;
    info->fd = -1;
    // Another report may be increasing the size right now. This block always fits a record.
    info->blockSize = std::max(OptimumBlockSize.load(), length);
    info->pBuffer = new (std::nothrow) char[static_cast<std::size_t>(info->blockSize)];
    if (info->pBuffer == nullptr) {
        // States one byte more than requested, which is what the text logs allocate.
        trace.error()("Memory allocation of %d bytes failed.",
                      static_cast<int>(info->blockSize + 1));
        return trace.result(false);
    }
    return trace.result(true);
}

void* AdminLogFile::getNextLogEntry(void* row, void* reportState, void* thresholds) {
    TraceScope trace(anchor);
    auto* const info = static_cast<_LogBufferInfo*>(reportState);
    const auto& window = *static_cast<const _RequestThresholds*>(thresholds);
    const auto* const columns = static_cast<const zrm_rmlogent_data_t*>(row);
    for (;;) {
        if (CTX1_IsCancelled()) {
            return trace.result(static_cast<void*>(nullptr));
        }
        if (info->bufferCount < length && fillReportBuffer(info) < length) {
            trace.error()("Incomplete record found while building report for file %s. "
                          "Record length = %d; expected length = %d.",
                          fileNameLocal(), static_cast<int>(info->bufferCount),
                          static_cast<int>(length));
            return trace.result(static_cast<void*>(nullptr));
        }
        info->bufferCount -= length;
        if (formatEntryAsRow(info->pBuffer + info->bufferCount, row, nullptr) != 0) {
            return trace.result(static_cast<void*>(nullptr));
        }
        if (compareTimes(columns->entrytime, window.endTime) > 0) {
            continue;
        }
        const bool isInWindow = compareTimes(columns->entrytime, window.startTime) >= 0;
        return trace.result(isInWindow ? row : nullptr);
    }
}

void AdminLogFile::endReportRequest(void** reportState) {
    TraceScope trace(anchor);
    auto* info = static_cast<_LogBufferInfo*>(*reportState);
    if (info != nullptr) {
        closeLogForReport(info->fd);
    }
    deallocateReportBuffers(&info);
    *reportState = nullptr;
}

void AdminLogFile::deallocateReportBuffers(_LogBufferInfo** reportState) {
    TraceScope trace(anchor);
    if (*reportState != nullptr) {
        delete[](*reportState)->pBuffer;
        delete *reportState;
    }
    *reportState = nullptr;
}

} // namespace zrm
