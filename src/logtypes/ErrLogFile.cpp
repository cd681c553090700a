#include "logtypes/ErrLogFile.h"

#include "base/ErrorText.h"
#include "base/TraceScope.h"

#include <cerrno>
#include <cstring>

#include <poll.h>
#include <sys/select.h>

namespace zrm {

namespace {

TRC1_Anchor anchor{"ErrLogFile.cpp"};

/// Waits up to one second for data on the descriptor. Like select(), returns a positive number if
/// there is data, 0 if not, or -1 and errno.
int waitForData(int fd) {
    if (fd >= FD_SETSIZE) {
        // Not limited to the descriptor sets of select().
        pollfd entry{fd, POLLIN, 0};
        return poll(&entry, 1, 1000);
    }
    fd_set readable;
    FD_ZERO(&readable);
    FD_SET(fd, &readable);
    timeval limit{1, 0};
    const int count = select(fd + 1, &readable, nullptr, nullptr, &limit);
    return count > 0 && !FD_ISSET(fd, &readable) ? 0 : count;
}

} // namespace

ErrLogFile::ErrLogFile(const ValidLog& log, LogFile* chainHead) : LogFile(log, chainHead) {
    TraceScope trace(anchor);
    if (trace.isOn(TRC1_DETAIL)) {
        printSelf();
    }
    startThread();
}

ErrLogFile::~ErrLogFile() {
    TraceScope trace(anchor);
    stopThread();
}

void ErrLogFile::processLogData() {
    TraceScope trace(anchor);
    int fds[2];
    if (openPipe(fds) != 0) {
        return;
    }
    m_readFd = fds[0];
    createChild(fds);
    if (m_childPid <= 0) {
        closePipe(&m_readFd);
        return;
    }
    if (m_readStream == nullptr) {
        closePipe(&m_readFd);
    } else {
        waitForEventLoop();
        closePipe(&m_readStream);
        m_readFd = -1;
    }
    killChild();
}

void ErrLogFile::waitForEventLoop() {
    TraceScope trace(anchor);
    while (monitorStatus() == MONITOR_RUNNING) {
        m_pulse.rest();
        const int ready = waitForData(m_readFd);
        m_pulse.work("reads the log's command");
        if (ready > 0) {
            if (readLog() != 0) {
                setMonitorStatus(MONITOR_ERR_READ);
                return;
            }
        } else if (ready < 0 && errno != EINTR) {
            const ErrorText error(errno);
            trace.error()("Error occurred during select() system call for command %s on fd %d. "
                          "errno = %d; %s",
                          procedure(), m_readFd, error.number(), error.text());
            setMonitorStatus(MONITOR_ERR_WAIT_EVENT);
            // This path releases the lock, and traces that, although it does not hold it. Unlocking
            // a free mutex is undefined, so the lock is taken here first, without a message.
            pthread_mutex_lock(&LogLock);
            unlockLog();
            return;
        }
    }
}

long ErrLogFile::readLog() {
    TraceScope trace(anchor);
    while (readLine()) {
        deliverLine();
        if (monitorStatus() == MONITOR_STOPPED) {
            return trace.result(0L);
        }
    }
    const ErrorText error(errno);
    if (std::feof(m_readStream) != 0) {
        trace.error()("EOF detected during fgets() system call on pipe %d to command %s.", m_readFd,
                      procedure());
        return trace.result(-1L);
    }
    if (error.number() != EAGAIN) {
        trace.error()("Error occurred during fgets() system call on pipe %d to command %s. "
                      "errno = %d; %s",
                      m_readFd, procedure(), error.number(), error.text());
        return trace.result(-1L);
    }
    std::clearerr(m_readStream);
    return trace.result(0L);
}

// Reads up to 255 characters as fgets does, but keeps an incomplete line. The stream does not
// block, and fgets does not report what it read before it failed.
bool ErrLogFile::readLine() {
    int character = 0;
    while (m_lineLength < sizeof m_line - 1 && character != '\n') {
        character = getc_unlocked(m_readStream);
        if (character != EOF) {
            m_line[m_lineLength++] = static_cast<char>(character);
        } else if (m_lineLength > 0 && std::feof(m_readStream) != 0) {
            break;
        } else {
            return false;
        }
    }
    m_line[m_lineLength] = '\0';
    m_lineLength = 0;
    return true;
}

void ErrLogFile::deliverLine() {
    ++NumEvents;
    m_ledger.addBytes(static_cast<std::int64_t>(std::strlen(m_line)));
    m_ledger.noteEntries();
    zrm_rmlogent_data_t row;
    if (formatEntryAsRow(m_line, &row, nullptr) == 0) {
        if (!offer(&row)) {
            return;
        }
        writeToDebugLog(m_line, std::strlen(m_line), &row, sizeof row);
    } else {
        ++NumFormatErrors;
        m_ledger.noteRejected(m_line);
        writeToDebugLog(m_line, std::strlen(m_line), nullptr, 0);
    }
}

} // namespace zrm
