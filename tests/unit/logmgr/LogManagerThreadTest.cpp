// The manager thread: signals, the waits at its end, and its cancellation.

#include "LogManagerFixture.h"

#include "AgentDoubles.h"
#include "support/Faults.h"

#include <gmock/gmock.h>

#include <cerrno>

#include <unistd.h>

using namespace zrm;

namespace {

using testing::ElementsAre;
using testing::ExitedWithCode;
using testing::IsEmpty;
using testing::KilledBySignal;

constexpr const char* terminating = "Log manager thread is terminating.";
constexpr const char* suspended =
    "Shutdown suspended for up to 10 seconds pending completion of server initialization.";

class LogManagerThreadTest : public LogManagerFixture {
protected:
    LogManagerThreadTest() { configure(a + "\n"); }

    void stopsCleanly() {
        trace.clear();
        manager.reset();
        EXPECT_TRUE(trace.contains("Manager thread terminated."));
        EXPECT_TRUE(trace.contains("Log manager mutex destroyed."));
        EXPECT_THAT(messagesThatBegin({"Error"}), IsEmpty());
    }
    /// Starts a manager with its server up and returns what it traces for this signal.
    std::vector<std::string> end(int number) {
        trace.setLevel(TRC1_DETAIL);
        start();
        manager->setServerUp();
        trace.clear();
        kill(getpid(), number);
        EXPECT_TRUE(trace.waitFor(terminating));
        return messages();
    }
};

TEST_F(LogManagerThreadTest, SigtermAndSigintEndTheAgent) {
    for (const int number : {SIGTERM, SIGINT}) {
        AgentDoubles::reset();
        EXPECT_THAT(end(number),
                    ElementsAre("Stop signal received.", "Log manager terminating framework.",
                                "Log manager locked.", "Shutdown resuming.",
                                "Log manager unlocked.", "Framework terminated with status .",
                                terminating));
        EXPECT_EQ(AgentDoubles::shutdowns(), 1);
        EXPECT_EQ(manager->numLogs(), 1U);
        stopsCleanly();
    }
}

TEST_F(LogManagerThreadTest, SigchldIsIgnored) {
    trace.setLevel(TRC1_DETAIL | TRC1_FINE);
    start();
    trace.clear();
    kill(getpid(), SIGCHLD);
    ASSERT_TRUE(trace.waitFor("SIGCHLD signal ignored."));
    EXPECT_THAT(trace.messages(), ElementsAre("SIGCHLD signal ignored."));
    kill(getpid(), SIGHUP);
    EXPECT_TRUE(trace.waitFor(waiting));
}

TEST_F(LogManagerThreadTest, SigchldIsTracedInTheFineClassOnly) {
    start();
    trace.clear();
    trace.setLevel(TRC1_DETAIL | TRC1_ERROR);
    kill(getpid(), SIGCHLD);
    // Of two pending signals, sigwait takes the one with the lower number first.
    ASSERT_TRUE(waitUntil([] {
        sigset_t pending;
        return sigpending(&pending) == 0 && sigismember(&pending, SIGCHLD) == 0;
    }));
    kill(getpid(), SIGHUP);
    ASSERT_TRUE(trace.waitFor(waiting));
    EXPECT_FALSE(trace.contains("SIGCHLD signal ignored."));
}

TEST_F(LogManagerThreadTest, AFailedSignalWaitEndsTheAgent) {
    Fault fault("sigwait", EINVAL);
    trace.setLevel(TRC1_ERROR);
    manager = std::make_unique<LogManager>();
    manager->setServerUp();
    ASSERT_TRUE(waitUntil([] { return AgentDoubles::shutdowns() == 1; }));
    EXPECT_THAT(trace.messages(), ElementsAre("Error while manager waiting for refresh signal. "
                                              "errno = 22; Invalid argument"));
}

TEST_F(LogManagerThreadTest, AnUnexpectedSignalEndsTheAgent) {
    const FakeSignal unexpected(SIGUSR1);
    trace.setLevel(TRC1_ERROR);
    manager = std::make_unique<LogManager>();
    manager->setServerUp();
    ASSERT_TRUE(waitUntil([] { return AgentDoubles::shutdowns() == 1; }));
    EXPECT_THAT(trace.messages(), ElementsAre("Manager received unexpected signal.  Signal = " +
                                              std::to_string(SIGUSR1)));
}

TEST_F(LogManagerThreadTest, TheStopWaitsForTheServer) {
    start();
    trace.clear();
    kill(getpid(), SIGTERM);
    ASSERT_TRUE(trace.waitFor(suspended));
    EXPECT_EQ(AgentDoubles::shutdowns(), 0);
    manager->setServerUp();
    ASSERT_TRUE(trace.waitFor(terminating));
    EXPECT_THAT(messagesThatBegin({"Shutdown", "Framework"}),
                ElementsAre(suspended, "Shutdown resuming.", "Framework terminated with status ."));
    EXPECT_EQ(AgentDoubles::shutdowns(), 1);
}

TEST_F(LogManagerThreadTest, IsCancelledInItsSignalWait) {
    start();
    stopsCleanly();
}

TEST_F(LogManagerThreadTest, IsCancelledWhileARefreshWaitsForRequests) {
    start();
    configure(b + "\n");
    manager->beginRequest();
    kill(getpid(), SIGHUP);
    ASSERT_TRUE(trace.waitFor("Refresh suspended pending completion of outstanding requests."));
    stopsCleanly();
    EXPECT_EQ(AgentDoubles::living(), 0);
}

TEST_F(LogManagerThreadTest, IsCancelledWhileItWaitsForTheServer) {
    start();
    kill(getpid(), SIGTERM);
    ASSERT_TRUE(trace.waitFor(suspended));
    stopsCleanly();
    EXPECT_EQ(AgentDoubles::shutdowns(), 0);
}

TEST_F(LogManagerThreadTest, IsCancelledWhileItSleepsWithoutWork) {
    configure("");
    manager = std::make_unique<LogManager>();
    ASSERT_TRUE(trace.waitFor("Agent has no work to do.  Exiting..."));
    stopsCleanly();
}

TEST_F(LogManagerThreadTest, IsNotCancelledWhileItBuildsItsLogs) {
    // Whenever the stop comes, every log is complete and is deleted.
    for (int i = 0; i < 20; ++i) {
        configure(a + "\n" + b + "\n" + c + "\n");
        manager = std::make_unique<LogManager>();
        manager.reset();
        EXPECT_EQ(AgentDoubles::living(), 0);
    }
    EXPECT_THAT(messagesThatBegin({"Error"}), IsEmpty());
}

class LogManagerThreadDeathTest : public LogManagerThreadTest {
protected:
    LogManagerThreadDeathTest() { GTEST_FLAG_SET(death_test_style, "fast"); }
    /// Runs a manager that receives this signal at its first wait.
    [[noreturn]] void run(int number, unsigned level) {
        trace.setLevel(level);
        const FakeSignal signal(number);
        manager = std::make_unique<LogManager>();
        waitForEnd();
    }
};

TEST_F(LogManagerThreadDeathTest, SigquitAborts) {
    EXPECT_EXIT(
        {
            trace.setLevel(TRC1_DETAIL);
            start();
            kill(getpid(), SIGQUIT);
            waitForEnd();
        },
        KilledBySignal(SIGABRT), "\nQUIT signal received\\. Aborting\\.\n");
}

TEST_F(LogManagerThreadDeathTest, AServerThatNeverComesUpEndsTheProcess) {
    const std::string timedOut =
        "Wait for server timed out; process is exiting\\.  Return code = 110 Connection timed "
        "out\\.  Use the return code and message to investigate the failure\\.  Agent is "
        "terminating\\.\n";
    EXPECT_EXIT(
        {
            const FakeTimedWait timeOut;
            run(SIGTERM, TRC1_DETAIL);
        },
        ExitedWithCode(255),
        std::string("\n") + suspended + "\nLog manager unlocked.\n" + timedOut);
    // The message is in no other class.
    EXPECT_EXIT(
        {
            const FakeTimedWait timeOut;
            run(SIGTERM, TRC1_ERROR | TRC1_FLOW | TRC1_FINE);
        },
        ExitedWithCode(255), testing::Not(testing::HasSubstr("Wait for server")));
}

TEST_F(LogManagerThreadDeathTest, TheWaitForTheServerHasALimitOfTenSeconds) {
    static FakeTimedWait* timeOut = nullptr;
    EXPECT_EXIT(
        {
            timeOut = new FakeTimedWait;
            std::atexit([] { _exit(timeOut->requested() == 10 ? 10 : 1); });
            run(SIGTERM, TRC1_ERROR);
        },
        ExitedWithCode(10), "^$");
}

TEST_F(LogManagerThreadDeathTest, AFailedWaitForTheServerEndsTheProcess) {
    EXPECT_EXIT(
        {
            Fault fault("pthread_cond_timedwait", EINVAL);
            run(SIGTERM, TRC1_DETAIL);
        },
        ExitedWithCode(255),
        "\nWait for server timed out; process is exiting\\.  Return code = 22 Invalid argument\\.  "
        "Use the return code and message to investigate the failure\\.  Agent is "
        "terminating\\.\n");
}

TEST_F(LogManagerThreadDeathTest, TheManagerThreadMayDestroyItsManager) {
    // As the exit routine does when the manager thread itself ends the process. The log's own
    // thread may notice its end before its object is deleted.
    static LogManager* theManager = nullptr;
    EXPECT_EXIT(
        {
            trace.setLevel(TRC1_DETAIL);
            const FakeTimedWait timeOut;
            std::atexit([] { delete theManager; });
            theManager = new LogManager;
            trace.waitFor(waiting);
            kill(getpid(), SIGTERM);
            waitForEnd();
        },
        ExitedWithCode(255),
        "\nShutdown commencing\\.\nLog manager mutex destroyed\\.\n'inuse' condition variable "
        "destroyed\\.\n'server-up' condition variable destroyed\\.\n"
        "(Thread for log file [^\n]* terminating\\.\n)?Deleting log object for file ");
}

} // namespace
