#include "logtypes/ErrLogFile.h"

#include "ErrLogTest.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <csignal>

#include <fcntl.h>
#include <sys/resource.h>
#include <unistd.h>

using namespace zrm;

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;
using testing::SizeIs;

using ErrLogFileTest = ErrLogTest;

TEST_F(ErrLogFileTest, TurnsTheLinesOfTheCommandIntoRows) {
    // The shell holds the output open until it ends, so the monitor's signal comes too late for it.
    const std::string command = printing(std::string(header) + entry + otherEntry) + "; exit";
    const auto monitor = start(command);
    ASSERT_TRUE(waitForStatus(*monitor, MONITOR_ERR_READ));
    const auto rows = EventRecorder::rows();
    ASSERT_EQ(rows.size(), 2U);
    EXPECT_EQ(columnText(rows[0].entrydesc), "A924A5FC: SOFTWARE PROGRAM ABNORMALLY TERMINATED");
    EXPECT_EQ(columnText(rows[1].entrysrc), "sysplanar0");
    EXPECT_EQ(columnText(rows[1].entrytime), "0991231235900000");

    const auto bytes = [](const zrm_rmlogent_data_t& row) {
        return std::string(reinterpret_cast<const char*>(&row), sizeof row);
    };
    EXPECT_EQ(DebugLogRecorder::records(),
              (std::vector<DebugLogRecorder::Record>{
                  {header, ""}, {entry, bytes(rows[0])}, {otherEntry, bytes(rows[1])}}));
    EXPECT_EQ(monitor->numEvents(), 3);
    EXPECT_EQ(monitor->numFormatErrors(), 1);
    EXPECT_THAT(errors(), ElementsAre(endOfOutput(command)));
}

TEST_F(ErrLogFileTest, TracesTheLifeOfTheChildInTheDetailClass) {
    trace.setLevel(TRC1_DETAIL);
    const auto monitor = start("exit 3");
    ASSERT_TRUE(trace.waitFor("Thread for log file " + log + " terminating."));
    const std::string pid = std::to_string(childId());
    const std::string readFd = std::to_string(numberAfter("; read fd = "));
    const std::string writeFd = std::to_string(numberAfter("; write fd = "));
    const auto messages = trace.messages();
    for (const std::string& expected :
         {"Pipe opened successfully for file " + log + "; read fd = " + readFd +
              "; write fd = " + writeFd,
          "Parent process closing write fd " + writeFd + ".",
          "Child process created for file " + log + ". pid = " + pid + ".",
          std::string("Read end of pipe closed successfully."),
          "Thread for file " + log +
              " issuing \"kill -15\" to kill child process exit 3 ( pid = " + pid + " )",
          "Monitor command exit 3 ( pid = " + pid + " ) for file " + log +
              " has terminated normally; exit status = 3"}) {
        EXPECT_THAT(messages, Contains(expected));
    }
    EXPECT_THAT(trace.childMessages(),
                ElementsAre("Child process for file " + log +
                            " about to exec \"/bin/sh -c exit 3\"; redirecting fd 1 (stdout) to "
                            "pipe; closing fd's " +
                            readFd + " & " + writeFd + "."));
}

TEST_F(ErrLogFileTest, TracesAChildKilledByASignalInTheErrorClass) {
    const std::string command = "kill -9 $$";
    const auto monitor = start(command);
    ASSERT_TRUE(waitUntil([&] { return trace.messages().size() == 2; }));
    EXPECT_THAT(errors(), ElementsAre(endOfOutput(command),
                                      "Monitor command kill -9 $$ ( pid = N ) for file " + log +
                                          " has terminated abnormally; signal number = 9"));
}

TEST_F(ErrLogFileTest, ReplacesTheFirstPlaceholderWithTheLocalTime) {
    FakeClock clock(1159930989); // 4 October 2006 03:03:09 UTC
    trace.setLevel(TRC1_DETAIL);
    const std::string command = "echo -smmddhhmmyy mmddhhmmyy";
    const auto monitor = start(command);
    ASSERT_TRUE(trace.waitFor("Thread for log file " + log + " terminating."));
    EXPECT_THAT(DebugLogRecorder::records(),
                ElementsAre(DebugLogRecorder::Record{"-s1004030306 mmddhhmmyy\n", ""}));
    const std::string changed = "echo -s1004030306 mmddhhmmyy";
    EXPECT_THAT(masked(trace.childMessages()),
                ElementsAre("Command for file " + log + " changed to " + changed + ".",
                            "Child process for file " + log + " about to exec \"/bin/sh -c " +
                                changed +
                                "\"; redirecting fd N (stdout) to pipe; closing fd's N & N."));

    // The agent's command keeps its placeholder, so a restart inserts the new time.
    EXPECT_STREQ(monitor->procedure(), command.c_str());
    clock.set(1159930989 + 86400 + 60);
    static_cast<LogFile&>(*monitor) = *line(command);
    const auto records = DebugLogRecorder::waitForRecords(2);
    ASSERT_EQ(records.size(), 2U);
    EXPECT_EQ(records[1].entry, "-s1005030406 mmddhhmmyy\n");
}

TEST_F(ErrLogFileTest, StartsAtZeroWhenThereIsNoLocalTime) {
    const Fault fault("localtime_r", EOVERFLOW, {.times = -1});
    const auto monitor = start("echo mmddhhmmyy");
    const auto records = DebugLogRecorder::waitForRecords(1);
    ASSERT_EQ(records.size(), 1U);
    EXPECT_EQ(records[0].entry, "0000000000\n");
    EXPECT_THAT(trace.childMessages(),
                ElementsAre("Error deriving local time. Setting start time to zero."));
}

TEST_F(ErrLogFileTest, RunsACommandWithoutThePlaceholderUnchanged) {
    const Fault fault("localtime_r", EOVERFLOW, {.times = -1});
    const auto monitor = start("echo -s mmddhhmmy");
    const auto records = DebugLogRecorder::waitForRecords(1);
    ASSERT_EQ(records.size(), 1U);
    EXPECT_EQ(records[0].entry, "-s mmddhhmmy\n");
    EXPECT_THAT(trace.childMessages(), IsEmpty());
}

TEST_F(ErrLogFileTest, WithoutACommandEndsAtOnce) {
    const auto monitor = start("");
    ASSERT_TRUE(waitForStatus(*monitor, MONITOR_ERR_READ));
    EXPECT_EQ(statusText(*monitor), "Error: log read failed");
    EXPECT_THAT(errors(), ElementsAre(endOfOutput("")));
}

TEST_F(ErrLogFileTest, ARefreshStartsAnEndedCommandAgain) {
    const std::string command = printing(entry);
    const auto monitor = start(command);
    ASSERT_TRUE(waitForStatus(*monitor, MONITOR_ERR_READ));
    static_cast<LogFile&>(*monitor) = *line(command);
    EXPECT_EQ(EventRecorder::waitForRows(2).size(), 2U);
    ASSERT_TRUE(waitForStatus(*monitor, MONITOR_ERR_READ));
    EXPECT_EQ(monitor->numEvents(), 2);
}

TEST_F(ErrLogFileTest, WaitsForTheRestOfALine) {
    const auto monitor =
        start("printf 'A924A5FC   1004030306 P S SYS'; sleep 0.2; echo 'PROC one text'; sleep 9");
    const auto rows = EventRecorder::waitForRows(1);
    ASSERT_EQ(rows.size(), 1U);
    EXPECT_EQ(columnText(rows[0].entrysrc), "SYSPROC");
    EXPECT_EQ(columnText(rows[0].entrydesc), "A924A5FC: one text");
    EXPECT_EQ(monitor->numEvents(), 1);
    EXPECT_EQ(monitor->monitorStatus(), MONITOR_RUNNING);
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(ErrLogFileTest, ReadsALongLineInPiecesAndTheLastOneWithoutItsNewline) {
    std::string text = entry;
    text.pop_back();
    text.resize(255, 'x');
    const auto monitor = start(printing(text + "yyy\n" + otherEntry + "end"));
    ASSERT_TRUE(waitForStatus(*monitor, MONITOR_ERR_READ));
    const auto records = DebugLogRecorder::records();
    ASSERT_EQ(records.size(), 4U);
    EXPECT_EQ(records[0].entry, text);
    EXPECT_EQ(records[1].entry, "yyy\n");
    EXPECT_EQ(records[2].entry, otherEntry);
    EXPECT_EQ(records[3].entry, "end");
    EXPECT_EQ(monitor->numEvents(), 4);
    EXPECT_EQ(monitor->numFormatErrors(), 2);
}

TEST_F(ErrLogFileTest, AFailedReadEndsTheMonitor) {
    const UnreadableStreams unreadable;
    const auto monitor = start("sleep 9");
    ASSERT_TRUE(waitForStatus(*monitor, MONITOR_ERR_READ));
    EXPECT_EQ(errors().at(0), "Error occurred during fgets() system call on pipe N to command "
                              "sleep 9. errno = 21; Is a directory");
}

TEST_F(ErrLogFileTest, AFailedWaitForDataEndsTheMonitor) {
    trace.setLevel(TRC1_ERROR | TRC1_DETAIL);
    const Fault fault("select", EBADF);
    const auto monitor = start("sleep 9");
    ASSERT_TRUE(trace.waitFor("Thread for log file " + log + " terminating."));
    EXPECT_EQ(monitor->monitorStatus(), MONITOR_ERR_WAIT_EVENT);
    EXPECT_EQ(statusText(*monitor), "Error: wait for event failed");
    EXPECT_THAT(errors(), Contains("Error occurred during select() system call for command "
                                   "sleep 9 on fd N. errno = 9; Bad file descriptor"));
    // According to the trace, the lock is released once more than it is taken.
    EXPECT_EQ(trace.count("Mutex unlocked for " + log + "."),
              trace.count("Mutex locked for " + log + ".") + 1);
}

TEST_F(ErrLogFileTest, AnInterruptedWaitContinues) {
    const Fault fault("select", EINTR, {.times = 3});
    const auto monitor = start(printing(entry));
    EXPECT_EQ(EventRecorder::waitForRows(1).size(), 1U);
    EXPECT_EQ(fault.failed(), 3);
}

TEST_F(ErrLogFileTest, FollowsAPipeWhoseDescriptorIsTooHighForSelect) {
    rlimit before{};
    getrlimit(RLIMIT_NOFILE, &before);
    const rlimit raised{std::max<rlim_t>(before.rlim_cur, FD_SETSIZE + 64), before.rlim_max};
    ASSERT_EQ(setrlimit(RLIMIT_NOFILE, &raised), 0);
    std::vector<int> occupied;
    do {
        occupied.push_back(open("/dev/null", O_RDONLY | O_CLOEXEC));
    } while (occupied.back() >= 0 && occupied.back() < FD_SETSIZE);
    ASSERT_EQ(occupied.back(), FD_SETSIZE);
    const auto monitor = start(printing(entry) + "; sleep 0.1; " + printing(entry));
    EXPECT_TRUE(waitForStatus(*monitor, MONITOR_ERR_READ));
    EXPECT_EQ(EventRecorder::rows().size(), 2U);
    for (const int fd : occupied) {
        close(fd);
    }
}

TEST_F(ErrLogFileTest, DumpsItselfAtTheStartWhenTheDetailClassIsOn) {
    trace.setLevel(TRC1_DETAIL);
    const auto monitor = start("exit");
    EXPECT_THAT(trace.messages(), Contains(HasSubstr("\tMonitorStatus\t\t= 0")));
}

/// Failures on the way to a running child: the status, its text, and the message.
struct StartFailure {
    const char* function;
    int error;
    int skip;
    _MonitorStatus status;
    const char* statusText;
    std::string message; ///< with LOG for the log's name
    bool hasChild;
};

void PrintTo(const StartFailure& failure, std::ostream* out) {
    *out << failure.function << ", " << failure.statusText;
}

class ErrLogFileStartFailure : public ErrLogTest,
                               public testing::WithParamInterface<StartFailure> {};

TEST_P(ErrLogFileStartFailure, EndsTheMonitorAndLeavesNothingBehind) {
    const StartFailure& failure = GetParam();
    const int descriptors = openDescriptors();
    {
        const Fault fault(failure.function, failure.error, {.skip = failure.skip});
        const auto monitor = start("sleep 9");
        ASSERT_TRUE(waitForStatus(*monitor, failure.status));
        EXPECT_EQ(statusText(*monitor), failure.statusText);
    }
    std::string message = failure.message;
    message.replace(message.find("LOG"), 3, log);
    std::vector<std::string> expected = {message};
    if (failure.hasChild) {
        expected.push_back("Monitor command sleep 9 ( pid = N ) for file " + log +
                           " has terminated abnormally; signal number = 15");
    }
    EXPECT_EQ(errors(), expected);
    EXPECT_EQ(openDescriptors(), descriptors);
    EXPECT_TRUE(hasNoChild());
}

// The pipe's ends are made close-on-exec with two calls of fcntl().
INSTANTIATE_TEST_SUITE_P(
    Calls, ErrLogFileStartFailure,
    testing::Values(
        StartFailure{"pipe", EMFILE, 0, MONITOR_ERR_CREATE_PIPE, "Error: create pipe failed",
                     "Error creating pipe for file LOG. errno = 24; Too many open files", false},
        StartFailure{"fork", EAGAIN, 0, MONITOR_ERR_CREATE_CHILD, "Error: create child failed",
                     "Error creating child process for file LOG. errno = 11; Resource temporarily "
                     "unavailable",
                     false},
        StartFailure{"fcntl", EINVAL, 2, MONITOR_ERR_GET_PIPE_FLAG, "Error: get pipe flag failed",
                     "Error while getting flag for pipe N for file LOG. errno = 22; Invalid "
                     "argument",
                     true},
        StartFailure{"fcntl", EINVAL, 3, MONITOR_ERR_SET_PIPE_FLAG, "Error: set pipe flag failed",
                     "Error while setting flag for pipe N for file LOG. errno = 22; Invalid "
                     "argument",
                     true},
        StartFailure{"fdopen", ENOMEM, 0, MONITOR_ERR_PIPE_FDOPEN, "Error: pipe FD to FP failed",
                     "Error converting read pipe fd N to file pointer for log file LOG. errno = "
                     "12; Cannot allocate memory",
                     true}));

} // namespace
