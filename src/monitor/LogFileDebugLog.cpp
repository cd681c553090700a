#include "monitor/LogFile.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"

#include <atomic>
#include <cerrno>
#include <cstdlib>
#include <utility>

namespace zrm {

// The debug log that all logs share: every entry as it was read, and the row built from it.

namespace {

TRC1_Anchor anchor{"LogFileDebugLog.cpp"};

std::int64_t numRecords = 0; // guarded by m_debugFileLock

std::atomic<std::uint64_t> incompleteRecords{0};
bool isIncomplete = false; // of the last record; guarded by m_debugFileLock

/// The result of writing one piece of a record.
enum class Piece {
    NOT_WRITTEN,
    CUT, ///< only a part was written, or the newline was not
    WRITTEN,
};

/// Writes one piece of a record and a newline.
Piece writePiece(std::FILE* stream, const void* data, unsigned long length) {
    const std::size_t written = std::fwrite(data, 1, length, stream);
    if (written == 0) {
        return Piece::NOT_WRITTEN;
    }
    const bool isWhole = std::fputc('\n', stream) != EOF;
    return isWhole && written == length ? Piece::WRITTEN : Piece::CUT;
}

} // namespace

std::uint64_t LogFile::incompleteDebugRecords() noexcept {
    return incompleteRecords.load(std::memory_order_relaxed);
}

pthread_mutex_t LogFile::m_debugFileLock = PTHREAD_MUTEX_INITIALIZER;
std::atomic<std::FILE*> LogFile::m_debugLog{nullptr};

void LogFile::setDebugLog(std::FILE* stream) noexcept {
    m_debugLog = stream;
}

void LogFile::lockDebugFile(const char* who) {
    TraceScope trace(anchor);
    if (const int code = pthread_mutex_lock(&m_debugFileLock)) {
        const ErrorText error(code);
        trace.error()("Error locking mutex for debug file by %s. Return code = %d; %s.  Use the "
                      "return code and message to investigate the failure.  Agent is terminating.",
                      who, error.number(), error.text());
        std::exit(-1);
    }
    trace.detail()("Debug file mutex locked by %s.", who);
}

void LogFile::unlockDebugFile() {
    TraceScope trace(anchor);
    if (const int code = pthread_mutex_unlock(&m_debugFileLock)) {
        const ErrorText error(code);
        trace.error()("Error unlocking mutex for debug file.  Return code = %d; %s.  Use the "
                      "return code and message to investigate the failure.  Agent is terminating.",
                      error.number(), error.text());
        std::exit(-1);
    }
    trace.detail()("Debug file mutex unlocked.");
}

/// The open debug log if this log's entries must be copied to it, else null.
std::FILE* LogFile::debugLogStream() const {
    if (debugMode() != 'Y') {
        return nullptr;
    }
    return m_debugLog.load();
}

void LogFile::writeToDebugLog(const void* data1, unsigned long length1, const void* data2,
                              unsigned long length2) {
    if (std::FILE* const stream = debugLogStream()) {
        writeRecord(stream, data1, length1, data2, length2);
    } else {
        traceEntry();
    }
}

/// Traces an entry that is not copied to the debug log, which is the usual case.
void LogFile::traceEntry() const {
    TraceScope trace(anchor);
    if (trace.isOn(TRC1_DETAIL)) {
        trace.detail()("%s monitor detected event.", fileNameLocal());
    }
}

void LogFile::writeRecord(std::FILE* stream, const void* data1, unsigned long length1,
                          const void* data2, unsigned long length2) {
    TraceScope trace(anchor);
    int result = 0;
    int cause = 0;
    int causeOfLoss = 0;
    lockDebugFile(fileNameLocal());
    const auto lost = [&] {
        causeOfLoss = causeOfLoss == 0 ? errno : causeOfLoss;
        std::clearerr(stream); // so that the next record reports its own outcome
    };
    if (std::fprintf(stream, "%s%ld%s", "\t\t>>>>>>>>> RECORD ", static_cast<long>(++numRecords),
                     " <<<<<<<<<\n") < 0) {
        lost();
    }
    const auto write = [&](const void* data, unsigned long length) {
        if (data == nullptr || length == 0 || result == -1) {
            return;
        }
        const Piece piece = writePiece(stream, data, length);
        if (piece != Piece::WRITTEN) {
            cause = errno;
            lost();
        }
        result = piece == Piece::NOT_WRITTEN ? -1 : result + 1;
    };
    write(data1, length1);
    write(data2, length2);
    if (causeOfLoss == 0 && std::fflush(stream) != 0) { // for text that does not end with a newline
        lost();
    }
    const bool wasIncomplete = std::exchange(isIncomplete, causeOfLoss != 0);
    incompleteRecords.fetch_add(isIncomplete ? 1 : 0, std::memory_order_relaxed);
    const bool isNews = isIncomplete && !wasIncomplete && result != -1;
    unlockDebugFile();
    if (isNews) {
        const ErrorText error(causeOfLoss);
        trace.error()("The debug log does not take whole records.  errno = %d; %s", error.number(),
                      error.text());
    }
    if (result == -1) {
        const ErrorText error(cause);
        trace.error()("Error writing %s entry to debug log.  errno = %d; %s", fileNameLocal(),
                      error.number(), error.text());
    } else if (result > 0) {
        trace.detail()("Record written to debug log for log %s.", fileNameLocal());
    } else {
        trace.detail()("%s monitor detected event.", fileNameLocal());
    }
}

} // namespace zrm
