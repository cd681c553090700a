#include "logtypes/SysLogFile.h"

#include "base/BrevanTime.h"
#include "base/TraceScope.h"
#include "logs/RequestThresholds.h"
#include "monitor/ReportOutcome.h"

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <ctime>
#include <new>

namespace zrm {

// Reports on a syslog file, newest entry first.

namespace {

TRC1_Anchor anchor{"SysLogFileReport.cpp"};

constexpr std::size_t stampLength = 16;
constexpr std::int64_t longestLine = 999; ///< bytes; a longer line is cut to this

bool hasNewline(const char* eightBytes) {
    constexpr std::uint64_t ones = 0x0101010101010101;
    std::uint64_t word;
    std::memcpy(&word, eightBytes, sizeof word);
    word ^= ones * '\n'; // a newline becomes a zero byte
    return ((word - ones) & ~word & ones << 7U) != 0;
}

/// The last newline in the range from `from` up to, but not including, `to`; -1 if there is none.
std::int64_t lastNewline(const char* text, std::int64_t from, std::int64_t to) {
    while (to - from >= 8 && !hasNewline(text + to - 8)) {
        to -= 8;
    }
    while (to > from) {
        if (text[--to] == '\n') {
            return to;
        }
    }
    return -1;
}

} // namespace

void* SysLogFile::startReportRequest(void* /*request*/) {
    TraceScope trace(anchor);
    if (determineOptimumBlockSize() != 0) {
        return trace.result<void*>(nullptr);
    }
    const std::int64_t blockSize = OptimumBlockSize;
    const std::size_t bufferSize = static_cast<std::size_t>(blockSize) + 1;
    auto* state = new (std::nothrow) SyslogBufferInfo{};
    if (state == nullptr) {
        trace.error()("Memory allocation of %d bytes failed.",
                      static_cast<int>(sizeof(SyslogBufferInfo)));
        return trace.result<void*>(nullptr);
    }
    state->block.reset(new (std::nothrow) char[bufferSize]);
    if (!state->block) {
        trace.error()("Memory allocation of %d bytes failed.", static_cast<int>(bufferSize));
        deallocateReportBuffers(&state);
        return trace.result<void*>(nullptr);
    }
    trace.detail()("Read buffer of size %ld allocated for file %s.", static_cast<long>(bufferSize),
                   fileNameLocal());
    state->pBuffer = state->block.get();
    state->blockSize = blockSize;
    if (openLogForReport(state) < 0) {
        deallocateReportBuffers(&state);
        return trace.result<void*>(nullptr);
    }
    state->bufferCount = 0;
    state->pBuffer[blockSize] = '\0';
    BrevanTime::generateTimestamp(std::time(nullptr), state->timestamp);
    return trace.result<void*>(state);
}

void* SysLogFile::getNextLogEntry(void* row, void* reportState, void* thresholds) {
    TraceScope trace(anchor);
    auto& state = *static_cast<SyslogBufferInfo*>(reportState);
    const auto& window = *static_cast<const _RequestThresholds*>(thresholds);
    while (char* const line = previousLine(state)) {
        // The time alone decides whether a row is wanted. Formatting it again does not change it.
        char time[stampLength];
        std::memset(time, ' ', stampLength);
        formatEntryTime(time, line, reportState);
        if (followSettings() != nullptr && time[0] == ' ') {
            continue; // such a line does not end the report of a log that is followed
        }
        if (std::memcmp(time, window.endTime, stampLength) > 0) {
            continue;
        }
        const bool isOlder = std::memcmp(time, window.startTime, stampLength) < 0;
        if (isOlder || formatEntryAsRow(line, row, reportState) != 0) {
            ReportOutcome::note(time[0] == ' ' ? ReportEnd::noTime : ReportEnd::complete);
            break; // entries before an older entry are older still
        }
        return trace.result(row);
    }
    return trace.result<void*>(nullptr);
}

/// The newest line not yet returned, terminated, or null at the end of the report.
char* SysLogFile::previousLine(SyslogBufferInfo& state) {
    TraceScope trace(anchor);
    for (;;) {
        if (state.bufferCount == 0 && !refill(state)) {
            return trace.result<char*>(nullptr);
        }
        // The line begins after the previous line's newline. Its own newline is the last byte.
        const std::int64_t end = state.bufferCount;
        state.pBuffer[end] = '\0';
        const std::int64_t newline =
            lastNewline(state.pBuffer, std::max<std::int64_t>(end - longestLine - 1, 0), end - 1);
        const bool isLong = newline < 0 && end > longestLine;
        if (newline >= 0 || (!isLong && state.bytesLeft == 0)) {
            state.bufferCount = newline + 1;
            return trace.result(state.pBuffer + state.bufferCount);
        }
        if (isLong) {
            if (!cutLongLine(state)) {
                return trace.result<char*>(nullptr);
            }
        } else if (end >= state.blockSize) {
            --state.bufferCount; // pushing back a whole block would read it again forever
        }
        if (!refill(state)) {
            return trace.result<char*>(nullptr);
        }
    }
}

/// Drops the end of a line that is too long, so that only its first bytes remain as a line. Returns
/// false if that ends the report.
///
/// By definition, this drops one byte, reads a block that ends there, and searches again. The
/// report ends if nothing precedes such a block while the line is still too long. This code
/// computes the same result without reading a block per byte.
bool SysLogFile::cutLongLine(SyslogBufferInfo& state) {
    TraceScope trace(anchor);
    const std::int64_t blockStart = state.bytesLeft;
    const std::int64_t lineEnd = blockStart + state.bufferCount;
    // The newline before the line, or the last position where it may still be.
    const std::int64_t newline =
        blockStart + lastNewline(state.pBuffer, 0, state.bufferCount - longestLine - 1);
    const std::int64_t lastTooLongEnd = newline + longestLine + 2;
    if (blockStart == 0 || (lastTooLongEnd < lineEnd && lastTooLongEnd <= state.blockSize)) {
        ReportOutcome::note(ReportEnd::longLine);
        return trace.result(false);
    }
    state.bufferCount = lastTooLongEnd - 1 - blockStart;
    return trace.result(true);
}

/// Reads the block before the current one. Returns false if there is none, which ends the report
/// permanently.
bool SysLogFile::refill(SyslogBufferInfo& state) {
    if (fillReportBuffer(&state) > 0) {
        return true;
    }
    state.bufferCount = 0;
    state.bytesLeft = 0;
    return false;
}

void SysLogFile::endReportRequest(void** reportState) {
    TraceScope trace(anchor);
    auto* state = static_cast<SyslogBufferInfo*>(*reportState);
    if (state != nullptr) {
        closeLogForReport(state->fd);
        deallocateReportBuffers(&state);
        *reportState = nullptr;
    }
}

void SysLogFile::deallocateReportBuffers(SyslogBufferInfo** reportState) {
    TraceScope trace(anchor);
    delete *reportState;
    *reportState = nullptr;
}

} // namespace zrm
