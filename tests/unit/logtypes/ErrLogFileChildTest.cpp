#include "logtypes/ErrLogFile.h"

#include "ErrLogTest.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>
#include <chrono>
#include <csignal>
#include <cstdlib>
#include <fstream>
#include <sstream>
#include <thread>

#include <sys/wait.h>
#include <unistd.h>

using namespace zrm;

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::Not;

constexpr const char* endlessEntries =
    "while :; do echo 'A924A5FC   1004030306 P S SYSPROC endless'; done";

/// The state letter of a process, '-' when there is none.
char processState(int pid) {
    std::ifstream file("/proc/" + std::to_string(pid) + "/stat");
    std::string text;
    std::getline(file, text);
    const std::size_t end = text.rfind(')');
    return end == std::string::npos ? '-' : text[end + 2];
}

bool hasEnded(int pid) {
    const char state = processState(pid);
    return state == '-' || state == 'Z';
}

class ErrLogFileChildTest : public ErrLogTest {
protected:
    ErrLogFileChildTest() { trace.setLevel(TRC1_ERROR | TRC1_DETAIL); }

    /// Starts a monitor and waits until its command has written something.
    std::unique_ptr<ErrLogFile> startAndRead(const std::string& command) {
        auto monitor = start(command);
        EXPECT_FALSE(DebugLogRecorder::waitForRecords(1).empty());
        return monitor;
    }
    std::string terminated(const std::string& command, const std::string& how) const {
        return "Monitor command " + command + " ( pid = N ) for file " + log + " has terminated " +
               how;
    }
    std::string firstLine() const { return DebugLogRecorder::waitForRecords(1).at(0).entry; }
};

TEST_F(ErrLogFileChildTest, StoppingEndsAndReapsASilentChildAfterAtMostOneMoreWait) {
    const std::string command = "echo; exec sleep 1000";
    auto monitor = startAndRead(command);
    const int pid = childId();
    EXPECT_EQ(getpgid(pid), pid);
    {
        const Fault waits("select", 0, {.times = 0});
        monitor.reset();
        EXPECT_LE(waits.calls(), 1);
    }
    EXPECT_EQ(shortSelect->requested(), 1'000'000);
    EXPECT_EQ(kill(pid, 0), -1);
    EXPECT_THAT(errors(), Contains(terminated(command, "abnormally; signal number = 15")));
    EXPECT_TRUE(hasNoChild());
}

TEST_F(ErrLogFileChildTest, StoppingWaitsForAChildThatIgnoresTheSignalForAWhile) {
    const std::string command = "trap '' 15; echo; sleep 0.5; exit 4";
    auto monitor = startAndRead(command);
    monitor.reset();
    EXPECT_THAT(errors(), Contains(terminated(command, "normally; exit status = 4")));
    EXPECT_TRUE(hasNoChild());
}

TEST_F(ErrLogFileChildTest, StoppingDoesNotWaitForAChildThatNeverStopsWriting) {
    auto monitor = startAndRead(endlessEntries);
    ASSERT_GE(EventRecorder::waitForRows(100).size(), 100U);
    monitor.reset();
    EXPECT_TRUE(hasNoChild());
}

TEST_F(ErrLogFileChildTest, StoppingEndsAChildThatHasFilledItsPipe) {
    std::atomic<bool> isReleased{false};
    EventRecorder::onRow([&](std::size_t) { waitUntil([&] { return isReleased.load(); }); });
    auto monitor = start(endlessEntries);
    ASSERT_EQ(EventRecorder::waitForRows(1).size(), 1U);
    const int pid = childId();
    // A shell that waits for room in the pipe sleeps and keeps sleeping.
    ASSERT_TRUE(waitUntil([&] {
        for (int i = 0; i < 20; ++i) {
            if (processState(pid) != 'S') {
                return false;
            }
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
        return true;
    }));
    const std::string unlocked = "Mutex unlocked for " + log + ".";
    const int before = trace.count(unlocked);
    std::thread stopper([&] { monitor.reset(); });
    EXPECT_TRUE(waitUntil([&] { return trace.count(unlocked) > before; })); // the status is set
    isReleased = true;
    stopper.join();
    EXPECT_TRUE(hasNoChild());
}

TEST_F(ErrLogFileChildTest, StoppingAlsoEndsWhatTheShellStarted) {
    auto monitor = startAndRead("sleep 1000 & echo $!; wait");
    const int grandchild = std::atoi(firstLine().c_str());
    ASSERT_GT(grandchild, 0);
    ASSERT_FALSE(hasEnded(grandchild));
    monitor.reset();
    EXPECT_TRUE(waitUntil([&] { return hasEnded(grandchild); }));
}

TEST_F(ErrLogFileChildTest, WhatOutlivesTheShellEndsWithTheMonitor) {
    // The shell ends immediately; its pipe stays open and is read.
    auto monitor = start("{ sleep 0.2; " + printing(entry) + "; exec sleep 1000; } & echo $!");
    ASSERT_EQ(EventRecorder::waitForRows(1).size(), 1U);
    EXPECT_EQ(monitor->monitorStatus(), MONITOR_RUNNING);
    const int survivor = std::atoi(firstLine().c_str());
    EXPECT_FALSE(hasEnded(survivor));
    EXPECT_TRUE(waitUntil([&] { return hasEnded(childId()); }));
    monitor.reset();
    EXPECT_TRUE(hasNoChild());
    EXPECT_TRUE(waitUntil([&] { return hasEnded(survivor); }));
}

TEST_F(ErrLogFileChildTest, AChildBlocksNoSignalAndIgnoresNeitherPipeNorTermination) {
    sigset_t all;
    sigset_t before;
    sigfillset(&all);
    pthread_sigmask(SIG_SETMASK, &all, &before);
    const auto oldPipe = std::signal(SIGPIPE, SIG_IGN);
    const auto oldTermination = std::signal(SIGTERM, SIG_IGN);
    const auto monitor = start("exec grep -E '^Sig(Blk|Ign)' /proc/self/status");
    const auto records = DebugLogRecorder::waitForRecords(2);
    std::signal(SIGPIPE, oldPipe);
    std::signal(SIGTERM, oldTermination);
    pthread_sigmask(SIG_SETMASK, &before, nullptr);
    ASSERT_EQ(records.size(), 2U);
    EXPECT_EQ(records[0].entry, "SigBlk:\t0000000000000000\n");
    const auto ignored = std::stoull(records[1].entry.substr(8), nullptr, 16);
    EXPECT_EQ(ignored & (1ULL << (SIGPIPE - 1)), 0U);
    EXPECT_EQ(ignored & (1ULL << (SIGTERM - 1)), 0U);
}

TEST_F(ErrLogFileChildTest, AChildInheritsOnlyTheStandardDescriptors) {
    const auto other = startAndRead("echo; exec sleep 1000");
    DebugLogRecorder::clear();
    // As if another thread had opened it and not yet set it to close on exec.
    const int open = dup(0);
    const auto monitor = start("ls /proc/self/fd; echo end");
    const auto records = DebugLogRecorder::waitForRecords(5);
    close(open);
    std::string listing;
    for (const auto& record : records) {
        listing += record.entry;
    }
    EXPECT_EQ(listing, "0\n1\n2\n3\nend\n"); // 3 is the directory that is being listed
}

TEST_F(ErrLogFileChildTest, WorksWhenItsPipeTakesTheStandardDescriptors) {
    const int savedInput = dup(0);
    const int savedOutput = dup(1);
    close(0);
    close(1); // the pipe's write end takes its place
    const std::string command = printing(entry);
    auto monitor = start(command);
    const bool isRead = waitForStatus(*monitor, MONITOR_ERR_READ);
    monitor.reset();
    dup2(savedInput, 0);
    dup2(savedOutput, 1);
    close(savedInput);
    close(savedOutput);
    EXPECT_TRUE(isRead);
    EXPECT_EQ(EventRecorder::rows().size(), 1U);
    EXPECT_THAT(errors(), Contains(endOfOutput(command)));
}

std::string exitRoutineMark;

TEST_F(ErrLogFileChildTest, AFailedExecEndsTheChildWithoutTheExitRoutine) {
    exitRoutineMark = directory.file("exit-routine-ran");
    std::atexit([] {
        if (!exitRoutineMark.empty()) {
            std::ofstream(exitRoutineMark).put('x');
        }
    });
    trace.setLevel(TRC1_ERROR);
    const Fault fault("execl", ENOENT);
    {
        const auto monitor = start("echo");
        ASSERT_TRUE(waitForStatus(*monitor, MONITOR_ERR_READ));
        trace.setLevel(TRC1_ERROR | TRC1_DETAIL);
    }
    EXPECT_THAT(trace.childMessages(),
                ElementsAre("Error executing command echo for file " + log +
                            ". errno = 2; No such file or directory.  Use the error number and "
                            "message to investigate the failure.  Agent is terminating."));
    EXPECT_FALSE(std::filesystem::exists(exitRoutineMark));
    exitRoutineMark.clear();
}

TEST_F(ErrLogFileChildTest, AFailedExecGivesStatus255) {
    const Fault fault("execl", EBADMSG);
    {
        const auto monitor = start("echo");
        trace.waitFor("Thread for log file " + log + " terminating.");
    }
    EXPECT_THAT(errors(), Contains(terminated("echo", "normally; exit status = 255")));
    // An error that exec does not have has no text.
    EXPECT_THAT(trace.childMessages(),
                Contains("Error executing command echo for file " + log +
                         ". errno = 74; Unknown error.  Use the error number and message to "
                         "investigate the failure.  Agent is terminating."));
}

TEST_F(ErrLogFileChildTest, AChildThatCannotBeSignalledIsNotWaitedFor) {
    trace.setLevel(TRC1_ERROR);
    {
        const Fault fault("kill", EPERM);
        const auto monitor = start("exit");
        ASSERT_TRUE(waitUntil([&] { return trace.messages().size() == 2; }));
    }
    EXPECT_THAT(errors(), ElementsAre(endOfOutput("exit"),
                                      "Error attempting to terminate command exit ( pid = N ) for "
                                      "file " +
                                          log + ". errno = 1; Operation not permitted"));
    EXPECT_GT(waitpid(-1, nullptr, 0), 0);
}

TEST_F(ErrLogFileChildTest, AFailedWaitIsTraced) {
    trace.setLevel(TRC1_ERROR);
    {
        const Fault fault("waitpid", ECHILD);
        const auto monitor = start("exit");
        ASSERT_TRUE(waitUntil([&] { return trace.messages().size() == 2; }));
    }
    EXPECT_THAT(errors(),
                ElementsAre(endOfOutput("exit"), "Wait system called failed for file " + log +
                                                     "; pid = N. errno = 10; No child "
                                                     "processes"));
    EXPECT_GT(waitpid(-1, nullptr, 0), 0);
}

TEST_F(ErrLogFileChildTest, TheEndOfAnotherChildIsTraced) {
    trace.setLevel(TRC1_ERROR);
    const FakeWaitedId fake(1);
    const auto monitor = start("exit 2");
    ASSERT_TRUE(waitUntil([&] { return trace.messages().size() == 2; }));
    EXPECT_EQ(trace.messages()[1],
              "Unknown child termination detected by " + log + " thread; pid = 1; status = 512");
}

TEST_F(ErrLogFileChildTest, TracesAFailedCloseOfTheStream) {
    trace.setLevel(TRC1_ERROR);
    const Fault fault("fclose", EIO);
    const auto monitor = start("exit");
    ASSERT_TRUE(waitUntil([&] { return trace.messages().size() == 2; }));
    EXPECT_THAT(errors(), ElementsAre(endOfOutput("exit"), "Error closing read end of pipe. errno "
                                                           "= 5; Input/output error"));
}

TEST_F(ErrLogFileChildTest, TracesTheCloseOfTheDescriptor) {
    {
        const Fault fault("fork", EAGAIN);
        const auto monitor = start("exit");
        ASSERT_TRUE(trace.waitFor("Thread for log file " + log + " terminating."));
    }
    const std::string fd = std::to_string(numberAfter("; read fd = "));
    EXPECT_THAT(trace.messages(),
                Contains("Read end of pipe closed successfully; fd = " + fd + "."));

    trace.clear();
    trace.setLevel(TRC1_ERROR);
    const Fault forkFault("fork", EAGAIN);
    const Fault closeFault("close", EIO, {.skip = 1});
    const auto monitor = start("exit");
    ASSERT_TRUE(waitUntil([&] { return trace.messages().size() == 2; }));
    EXPECT_EQ(errors()[1], "Error closing read end of pipe; fd = N. errno = 5; Input/output error");
    close(numberAfter("pipe; fd = "));
}

TEST_F(ErrLogFileChildTest, DescribesEveryWayAChildCanEnd) {
    const auto monitor = start("exit");
    ASSERT_TRUE(trace.waitFor("Thread for log file " + log + " terminating."));
    const auto described = [&](int status, TRC1_Class traceClass) {
        trace.setLevel(traceClass);
        trace.clear();
        monitor->printChildStatus(4711, status, "errpt  ");
        return trace.messages();
    };
    const std::string who = "Report command errpt   ( pid = 4711 ) for file " + log + " has ";
    constexpr int coreFlag = 0x80;
    constexpr int stopFlag = 0x7f;
    EXPECT_THAT(described(5 << 8, TRC1_DETAIL),
                ElementsAre(who + "terminated normally; exit status = 5"));
    EXPECT_THAT(described(SIGKILL, TRC1_ERROR),
                ElementsAre(who + "terminated abnormally; signal number = 9"));
    EXPECT_THAT(
        described(SIGABRT | coreFlag, TRC1_ERROR),
        ElementsAre(who + "terminated abnormally; signal number = 6 (core file generated)"));
    EXPECT_THAT(described((SIGSTOP << 8) | stopFlag, TRC1_ERROR),
                ElementsAre(who + "been stopped by a signal; signal number = 19"));
    trace.clear();
    monitor->printChildStatus(4711, 0, nullptr);
    trace.setLevel(TRC1_DETAIL);
    monitor->printChildStatus(4711, 0, nullptr);
    EXPECT_THAT(trace.messages(), ElementsAre("Report command  ( pid = 4711 ) for file " + log +
                                              " has terminated normally; exit status = 0"));
}

TEST_F(ErrLogFileChildTest, AThousandStartsAndStopsLeaveNothingBehind) {
    trace.setLevel(0);
    const auto ending = line("exit");
    const auto running = line(printing(entry) + "; exec sleep 1000");
    { const ErrLogFile warmUp(*running, nullptr); }
    const int descriptors = openDescriptors();
    for (int i = 0; i < 250; ++i) {
        // Stopped while it runs, while it may still be starting, after its end, and restarted.
        EventRecorder::clear();
        DebugLogRecorder::clear();
        {
            const ErrLogFile monitor(*running, nullptr);
            EventRecorder::waitForRows(1);
        }
        { const ErrLogFile monitor(*running, nullptr); }
        ErrLogFile monitor(*ending, nullptr);
        ASSERT_TRUE(waitForStatus(monitor, MONITOR_ERR_READ));
        static_cast<LogFile&>(monitor) = *ending;
    }
    EXPECT_EQ(openDescriptors(), descriptors);
    EXPECT_TRUE(hasNoChild());
}

} // namespace
