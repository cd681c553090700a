#include "TestLog.h"

#include "base/ProcessValues.h"
#include "support/TimeZone.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <cstring>

using namespace zrm;

namespace {

using testing::ElementsAre;
using testing::ExitedWithCode;
using testing::HasSubstr;
using testing::IsEmpty;

class LogFileTest : public MonitoredFile {
protected:
    /// Expects two records: the beginning of that of LogBase, and that of LogFile.
    void expectDump(const std::vector<std::string>& messages, std::size_t at,
                    const std::string& record) {
        ASSERT_GE(messages.size(), at + 2);
        EXPECT_THAT(messages[at], testing::StartsWith("\n\tthis\t\t\t= "));
        EXPECT_EQ(messages[at + 1], record);
    }
};

using LogFileDeathTest = LogFileTest;

const std::string useTheCode =
    "Use the return code and message to investigate the failure.  Agent is terminating.";

std::string record(const std::string& reader, int fd, long eof, int status,
                   const std::string& changed, int events, int errors) {
    return "\n\tRefreshMode\t\t= 0\n\tLogThread\t\t= \n\tLogLock\t\t\t= \n\tLogFileP\t\t= " +
           reader + "\n\tLogFD\t\t\t= " + std::to_string(fd) +
           "\n\tLogEOF\t\t\t= " + std::to_string(eof) +
           "\n\tMonitorStatus\t\t= " + std::to_string(status) +
           "\n\tMonitorStartStopTime\t= " + changed +
           "\n\tNumEvents\t\t= " + std::to_string(events) +
           "\n\tNumFormatErrors\t\t= " + std::to_string(errors) +
           "\n\tOptimumBlockSize\t= 0\n\tDebugFileLock\t\t= \n";
}

TEST_F(LogFileTest, StartsClosedAndNotStarted) {
    const FakeClock clock(1234);
    const auto line = validLog(m_path, " ;Y ;S");
    const TestLog log(*line);
    EXPECT_EQ(log.monitorStatus(), MONITOR_NOT_STARTED);
    EXPECT_EQ(log.reader(), nullptr);
    EXPECT_EQ(log.fd(), -1);
    EXPECT_EQ(log.eof(), -1);
    EXPECT_EQ(log.numEvents(), 0);
    EXPECT_EQ(log.numFormatErrors(), 0);
    EXPECT_EQ(log.blockSize(), 0);
    EXPECT_EQ(log.monitorStartStopTime(), 1234);
    EXPECT_FALSE(log.isMarked());
    EXPECT_EQ(log.debugMode(), 'Y');
    EXPECT_EQ(log.type(), 'S');
    EXPECT_EQ(log.fileNameLocal(), m_path);
}

TEST_F(LogFileTest, JoinsAndLeavesTheChainOfLogs) {
    TestLog first(*m_line);
    EXPECT_EQ(first.next(), &first);
    TestLog second(*m_line, &first);
    {
        const TestLog third(*m_line, &first);
        EXPECT_EQ(second.next(), &third);
        EXPECT_EQ(third.next(), &first);
    }
    EXPECT_EQ(first.next(), &second);
    EXPECT_EQ(second.next(), &first);
}

TEST_F(LogFileTest, TracesTheLifeOfItsMutexInDetail) {
    RecordingTrace trace(TRC1_DETAIL);
    {
        const TestLog log(*m_line);
        EXPECT_TRUE(trace.contains("Mutex initialized for " + m_path + "."));
        trace.clear();
        log.lockLog();
        log.unlockLog();
        EXPECT_THAT(trace.messages(), ElementsAre("Mutex locked for " + m_path + ".",
                                                  "Mutex unlocked for " + m_path + "."));
        trace.clear();
    }
    EXPECT_THAT(trace.messages(), ElementsAre("Mutex locked for " + m_path + ".",
                                              "Mutex unlocked for " + m_path + ".",
                                              "Mutex destroyed for " + m_path + "."));
}

TEST_F(LogFileTest, AMutexThatCannotBeDestroyedIsTracedOnly) {
    auto log = std::make_unique<TestLog>(*m_line);
    RecordingTrace trace(TRC1_ERROR);
    {
        const Fault fault("pthread_mutex_destroy", EBUSY);
        log.reset();
    }
    EXPECT_THAT(trace.messages(), ElementsAre("Error destroying mutex for " + m_path +
                                              ".  Return code = 16; Device or resource busy"));
}

TEST_F(LogFileDeathTest, MutexFailuresOfTheConstructorEndTheAgent) {
    const RecordingTrace trace(TRC1_ERROR);
    EXPECT_EXIT(
        {
            const Fault fault("pthread_mutexattr_init", ENOMEM);
            const TestLog log(*m_line);
        },
        ExitedWithCode(255),
        exactly("Error initializing mutex attribute object for " + m_path +
                ". Return code = 12; Cannot allocate memory.  " + useTheCode));
    EXPECT_EXIT(
        {
            const Fault fault("pthread_mutex_init", EAGAIN);
            const TestLog log(*m_line);
        },
        ExitedWithCode(255),
        exactly("Error initializing mutex for " + m_path +
                ".  Return code = 11; Resource temporarily unavailable  " + useTheCode));
    EXPECT_EXIT(
        {
            const Fault fault("pthread_mutexattr_destroy", EINVAL);
            const TestLog log(*m_line);
        },
        ExitedWithCode(255),
        exactly("Error destroying mutex attribute object for " + m_path +
                ". Return code = 22; Invalid argument.  " + useTheCode));
}

TEST_F(LogFileDeathTest, FailuresOfTheLockEndTheAgent) {
    const RecordingTrace trace(TRC1_ERROR);
    const TestLog log(*m_line);
    EXPECT_EXIT(
        {
            const Fault fault("pthread_mutex_lock", EINVAL);
            log.lockLog();
        },
        ExitedWithCode(255),
        exactly("Error locking mutex for " + m_path + ".  Return code = 22; Invalid argument.  " +
                useTheCode));
    EXPECT_EXIT(
        {
            log.lockLog();
            const Fault fault("pthread_mutex_unlock", EPERM);
            log.unlockLog();
        },
        ExitedWithCode(255),
        exactly("Error unlocking mutex for " + m_path +
                ".  Return code = 1; Operation not permitted.  " + useTheCode));
}

TEST_F(LogFileDeathTest, TheEndComesWhateverTheTraceLevel) {
    const RecordingTrace trace(0);
    EXPECT_EXIT(
        {
            const Fault fault("pthread_mutex_init", EAGAIN);
            const TestLog log(*m_line);
        },
        ExitedWithCode(255), "^$");
}

TEST_F(LogFileDeathTest, FailuresOfTheThreadAttributesEndTheAgent) {
    const RecordingTrace trace(TRC1_ERROR);
    TestLog log(*m_line);
    EXPECT_EXIT(
        {
            const Fault fault("pthread_attr_init", ENOMEM);
            log.startThread();
        },
        ExitedWithCode(255),
        exactly("Error initializing thread attribute object for " + m_path +
                ". Return code = 12; Cannot allocate memory.  " + useTheCode));
    EXPECT_EXIT(
        {
            const Fault noThread("pthread_create", EAGAIN);
            const Fault fault("pthread_attr_destroy", EINVAL);
            log.startThread();
        },
        ExitedWithCode(255),
        testing::MatchesRegex(
            "Error starting thread for .*\nError destroying thread attribute object for .*messages"
            "\\. Return code = 22; Invalid argument\\.  Use the return code and message to "
            "investigate the failure\\.  Agent is terminating\\.\n"));
}

TEST_F(LogFileTest, RunsFromStartToStop) {
    FakeClock clock(1000);
    TestLog log(*m_line);
    RecordingTrace trace(TRC1_DETAIL);
    clock.set(2000);
    log.startThread();
    EXPECT_EQ(log.monitorStatus(), MONITOR_RUNNING);
    EXPECT_EQ(log.statusText(), "Running");
    EXPECT_EQ(log.monitorStartStopTime(), 2000);
    EXPECT_TRUE(trace.waitFor("Thread successfully started for log file " + m_path + "."));
    EXPECT_TRUE(waitUntil([&] { return log.eof() == 0; }));
    // By startThread and by the thread, which waits for it until the status is Running.
    EXPECT_EQ(trace.count("Mutex locked for " + m_path + "."), 2);
    clock.set(3000);
    log.stopThread();
    EXPECT_EQ(log.monitorStatus(), MONITOR_STOPPED);
    EXPECT_EQ(log.statusText(), "Stopped");
    EXPECT_EQ(log.monitorStartStopTime(), 3000);
    EXPECT_EQ(trace.count("Thread for log file " + m_path + " terminating."), 1);
    EXPECT_EQ(log.reader(), nullptr);
    EXPECT_EQ(log.fd(), -1);
    EXPECT_EQ(log.eof(), -1);
    log.stopThread(); // already joined
    EXPECT_EQ(log.monitorStatus(), MONITOR_STOPPED);
}

TEST_F(LogFileTest, StoppingANeverStartedLogLeavesItNotStarted) {
    TestLog log(*m_line);
    const Fault counter("pthread_join", 0, {.times = 0});
    log.stopThread();
    EXPECT_EQ(log.monitorStatus(), MONITOR_NOT_STARTED);
    EXPECT_EQ(log.statusText(), "Not started");
    EXPECT_EQ(counter.calls(), 0);
}

TEST_F(LogFileTest, AThreadAttributeThatCannotBeSetDoesNotPreventTheStart) {
    TestLog log(*m_line);
    RecordingTrace trace(TRC1_DETAIL);
    const Fault fault("pthread_attr_setdetachstate", EINVAL);
    log.startThread();
    EXPECT_EQ(log.monitorStatus(), MONITOR_RUNNING);
    EXPECT_EQ(trace.messages().front(), "Error making thread attribute object joinable for " +
                                            m_path +
                                            ". Return code = 22; Invalid argument. Continuing.");
}

TEST_F(LogFileTest, AThreadThatCannotBeStartedLeavesTheStatus) {
    const FakeClock clock(1000);
    TestLog log(*m_line);
    RecordingTrace trace(TRC1_ERROR);
    {
        const Fault fault("pthread_create", EAGAIN);
        log.startThread();
    }
    EXPECT_EQ(log.monitorStatus(), MONITOR_NOT_STARTED);
    EXPECT_EQ(log.monitorStartStopTime(), 1000);
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error starting thread for " + m_path +
                            ".  Return code = 11; Resource temporarily unavailable"));
}

TEST_F(LogFileTest, ARestartThatFailsCanBeStoppedAndTriedAgain) {
    TestLog log(*m_line);
    const Fault joins("pthread_join", 0, {.times = 0});
    log.startThread();
    log.stopThread();
    {
        const Fault fault("pthread_create", EAGAIN);
        log = *m_line; // does not join the old thread again
    }
    EXPECT_EQ(log.monitorStatus(), MONITOR_STOPPED);
    log = *m_line;
    EXPECT_EQ(log.monitorStatus(), MONITOR_RUNNING);
    EXPECT_EQ(joins.calls(), 1);
}

TEST_F(LogFileTest, ALogLeftOpenIsDumpedAtTheThreadsEnd) {
    const TimeZone zone("UTC0");
    const FakeClock clock(0);
    TestLog log(*m_line);
    log.closes = false;
    RecordingTrace trace(0);
    log.startThread();
    log.stopThread();
    char reader[32];
    std::snprintf(reader, sizeof reader, "%p", static_cast<const void*>(log.reader()));
    expectDump(trace.messages(), 0,
               record(reader, log.fd(), 0, 1, "Thu Jan  1 00:00:00 1970", 0, 0));
    log.closeLog();
}

TEST_F(LogFileTest, PrintSelfWritesEveryFieldWhateverTheLevel) {
    const TimeZone zone("UTC0");
    const FakeClock clock(1160031789);
    TestLog log(*m_line);
    RecordingTrace trace(0);
    log.printSelf();
    ASSERT_EQ(trace.messages().size(), 2U);
    expectDump(trace.messages(), 0, record("(nil)", -1, -1, 0, "Thu Oct  5 07:03:09 2006", 0, 0));
}

TEST_F(LogFileTest, ReconfigurationTakesTheDebugModeAndLeavesARunningMonitor) {
    TestLog log(*m_line);
    log.startThread();
    const Fault counter("pthread_create", 0, {.times = 0});
    RecordingTrace trace(TRC1_ERROR);
    log = *validLog(m_path, " ;Y ;U ;%s");
    EXPECT_EQ(log.debugMode(), 'Y');
    EXPECT_EQ(log.type(), 'S'); // nothing else is taken over
    EXPECT_STREQ(log.procedure(), "");
    EXPECT_EQ(counter.calls(), 0);
    EXPECT_EQ(log.monitorStatus(), MONITOR_RUNNING);
    log = *m_line;
    EXPECT_EQ(log.debugMode(), 'N');
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(LogFileTest, ReconfigurationRestartsAMonitorThatFailed) {
    m_directory.write("later", "");
    const auto line = validLog(m_directory.file("later"));
    std::filesystem::remove(m_directory.file("later"));
    TestLog log(*line);
    RecordingTrace trace(TRC1_ERROR);
    log.startThread();
    EXPECT_TRUE(trace.waitFor("Error opening file " + m_directory.file("later") +
                              ".  errno = 2; No such file or directory"));
    ASSERT_TRUE(waitUntil([&] { return log.monitorStatus() != MONITOR_RUNNING; }));
    EXPECT_EQ(log.statusText(), "Error: log open failed");
    m_directory.write("later", "");
    const Fault joins("pthread_join", 0, {.times = 0});
    log = *line;
    EXPECT_EQ(log.monitorStatus(), MONITOR_RUNNING);
    EXPECT_EQ(joins.calls(), 1); // of the thread that failed
}

TEST_F(LogFileTest, StoppingAFailedMonitorLeavesItsStatus) {
    TestLog log(*m_line);
    {
        const Fault fault("open", EACCES);
        log.startThread();
        ASSERT_TRUE(waitUntil([&] { return log.monitorStatus() != MONITOR_RUNNING; }));
    }
    log.stopThread();
    EXPECT_EQ(log.monitorStatus(), MONITOR_ERR_OPEN);
}

TEST_F(LogFileTest, ReconfigurationDumpsBeforeAndAfterInDetail) {
    TestLog log(*m_line);
    log.startThread();
    ASSERT_TRUE(waitUntil([&] { return log.eof() == 0; })); // from here on the thread is silent
    RecordingTrace trace(TRC1_DETAIL);
    log = *m_line;
    const auto messages = trace.messages();
    ASSERT_GE(messages.size(), 6U);
    EXPECT_THAT(messages[0], HasSubstr("\tLogFileNameUTF8\t"));
    EXPECT_THAT(messages[1], HasSubstr("\tRefreshMode\t"));
    EXPECT_EQ(std::count_if(messages.begin(), messages.end(),
                            [](const std::string& text) {
                                return text.find("\tRefreshMode\t") != std::string::npos;
                            }),
              2);
}

TEST_F(LogFileTest, StatusTextIsCutAndNotTerminated) {
    TestLog log(*m_line);
    char text[12] = "###########";
    log.getMonitorStatus(text, 3);
    EXPECT_STREQ(text, "Not########");
    log.getMonitorStatus(text, 11);
    EXPECT_STREQ(text, "Not started");
    std::memset(text, '#', 11);
    log.setMonitorStatus(MONITOR_RUNNING);
    log.getMonitorStatus(text, 11);
    EXPECT_STREQ(text, "Running####");
    log.getMonitorStatus(text, 0);
    EXPECT_STREQ(text, "Running####");
}

TEST_F(LogFileTest, SettingTheStatusTakesTheLock) {
    TestLog log(*m_line);
    RecordingTrace trace(TRC1_DETAIL);
    log.setMonitorStatus(MONITOR_ERR_FORMAT);
    EXPECT_EQ(log.monitorStatus(), MONITOR_ERR_FORMAT);
    EXPECT_THAT(trace.messages(), ElementsAre("Mutex locked for " + m_path + ".",
                                              "Mutex unlocked for " + m_path + "."));
}

} // namespace
