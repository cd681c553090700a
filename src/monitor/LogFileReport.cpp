#include "monitor/LogFile.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"
#include "framework/cancellation.h"
#include "monitor/ReportOutcome.h"

#include <algorithm>
#include <cerrno>
#include <optional>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

namespace zrm {

// Reads a log backwards for a report, block by block, on the thread of the report's request and
// through the report's own descriptor.

namespace {

TRC1_Anchor anchor{"LogFileReport.cpp"};

constexpr std::int64_t defaultBlockSize = 8192;
constexpr char syslogFile = 'S';
constexpr char userLog = 'U';

/// Whether the opened file is not the one that the log's monitor has open.
bool isAnother(int fd, const std::optional<FileIdentity>& monitored) {
    struct stat status;
    return monitored &&
           (fstat(fd, &status) != 0 || *monitored != FileIdentity{status.st_dev, status.st_ino});
}

} // namespace

unsigned char LogFile::determineOptimumBlockSize() {
    TraceScope trace(anchor);
    struct stat status;
    if (stat(fileNameLocal(), &status) != 0) {
        const ErrorText error(errno);
        trace.error()("stat() command failed for %s;  errno = %d; %s.", fileNameLocal(),
                      error.number(), error.text());
        return trace.result<unsigned char>(1);
    }
    OptimumBlockSize = status.st_blksize > 0 ? status.st_blksize : defaultBlockSize;
    return trace.result<unsigned char>(0);
}

long LogFile::openLogForReport(_LogBufferInfo* info) {
    TraceScope trace(anchor);
    const bool isBound = ReportOutcome::file() == ReportedFile::monitored;
    const std::optional<FileIdentity> monitored = isBound ? m_ledger.file() : std::nullopt;
    const int links = isBound && !monitored ? O_NOFOLLOW : 0;
    info->fd = open(fileNameLocal(), O_RDONLY | O_NONBLOCK | O_CLOEXEC | links);
    if (info->fd >= 0 && isAnother(info->fd, monitored)) {
        ReportOutcome::note(ReportEnd::otherFile);
        closeLogForReport(info->fd);
        info->fd = -1;
        return trace.result<long>(info->fd);
    }
    if (info->fd < 0) {
        const ErrorText error(errno);
        trace.error()("Error opening file %s for report.  errno = %d; %s", fileNameLocal(),
                      error.number(), error.text());
        return trace.result<long>(info->fd);
    }
    info->bytesLeft = lseek(info->fd, 0, SEEK_END);
    if (info->bytesLeft < 1) {
        const ErrorText error(errno);
        closeLogForReport(info->fd);
        info->fd = -1;
        if (info->bytesLeft == 0) {
            ReportOutcome::note(ReportEnd::complete);
            trace.detail()("Log %s is empty; report request terminating.", fileNameLocal());
        } else {
            trace.error()("Error while seeking EOF for report on file %s. errno = %d; %s",
                          fileNameLocal(), error.number(), error.text());
        }
        return trace.result(-1L);
    }
    trace.detail()("fd %d opened for report on %s; file size is %ld.", info->fd, fileNameLocal(),
                   static_cast<long>(info->bytesLeft));
    return trace.result<long>(info->fd);
}

/// Makes the unconsumed bytes at the start of the block unread again, so that the next block ends
/// with them.
void LogFile::pushBack(_LogBufferInfo* info) {
    TraceScope trace(anchor);
    if (lseek(info->fd, static_cast<off_t>(info->bufferCount), SEEK_CUR) < 1) {
        const ErrorText error(errno);
        trace.error()("Error while pushing %d bytes onto buffer for file %s. errno = %d; %s",
                      static_cast<int>(info->bufferCount), fileNameLocal(), error.number(),
                      error.text());
        ReportOutcome::note(ReportEnd::readError);
        info->bytesLeft = 0;
        return;
    }
    info->bytesLeft += info->bufferCount;
    trace.detail()("%d bytes pushed back onto buffer for file %s.",
                   static_cast<int>(info->bufferCount), fileNameLocal());
}

long LogFile::fillReportBuffer(_LogBufferInfo* info) {
    TraceScope trace(anchor);
    if (CTX1_IsCancelled()) {
        trace.detail()("Report on file %s is no longer wanted.", fileNameLocal());
        return trace.result(0L);
    }
    if (info->bufferCount > 0 && info->bytesLeft > 0) {
        pushBack(info);
    }
    const std::int64_t room = info->blockSize > 0 ? info->blockSize : OptimumBlockSize.load();
    const std::int64_t length = std::min(info->bytesLeft, room);
    if (length <= 0) {
        return trace.result(0L);
    }
    if (lseek(info->fd, static_cast<off_t>(-length), SEEK_CUR) < 0) {
        const ErrorText error(errno);
        trace.error()("Error while seeking start of read for report on file %s. errno = %d; %s",
                      fileNameLocal(), error.number(), error.text());
        ReportOutcome::note(ReportEnd::readError);
        return trace.result(0L);
    }
    info->bufferCount = read(info->fd, info->pBuffer, static_cast<std::size_t>(length));
    if (info->bufferCount != length) {
        trace.error()("Error while reading file %s. Bytes requested = %ld. Bytes received = %d.",
                      fileNameLocal(), static_cast<long>(length),
                      static_cast<int>(info->bufferCount));
        ReportOutcome::note(ReportEnd::readError);
        return trace.result(0L);
    }
    const off_t offset = lseek(info->fd, static_cast<off_t>(-length), SEEK_CUR);
    if (offset < 0) {
        const ErrorText error(errno);
        trace.error()("Error while resetting file pointer after read for file %s. errno = %d; %s",
                      fileNameLocal(), error.number(), error.text());
        ReportOutcome::note(ReportEnd::readError);
        return trace.result(0L);
    }
    if (LogType == syslogFile || LogType == userLog) {
        info->pBuffer[length] = '\0';
    }
    info->bytesLeft -= length;
    trace.detail()("%ld bytes read from file %s from offset %ld.", static_cast<long>(length),
                   fileNameLocal(), static_cast<long>(offset));
    return trace.result(static_cast<long>(length));
}

void LogFile::closeLogForReport(int fd) {
    TraceScope trace(anchor);
    if (close(fd) != 0) {
        const ErrorText error(errno);
        trace.error()("Error closing fd %d for report on file %s.  errno = %d; %s", fd,
                      fileNameLocal(), error.number(), error.text());
        return;
    }
    trace.detail()("fd %d closed for report on %s.", fd, fileNameLocal());
}

} // namespace zrm
