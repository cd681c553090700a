// The log manager's configuration and the building of its monitoring objects.

#include "LogManagerFixture.h"

#include "AgentDoubles.h"
#include "monitor/LogFile.h"
#include "support/Faults.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <cstdlib>

#include <unistd.h>

using namespace zrm;

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::ExitedWithCode;
using testing::IsEmpty;
using testing::Not;

class LogManagerRefreshTest : public LogManagerFixture {
protected:
    /// Runs a manager without work until it has asked the framework to end.
    void runWithoutLogs() {
        manager = std::make_unique<LogManager>();
        manager->setServerUp();
        ASSERT_TRUE(waitUntil([] { return AgentDoubles::shutdowns() == 1; }));
    }
    std::string hasNotChanged(const std::string& path) const {
        return path + " has not changed since last refresh. No refresh performed.";
    }

    FakeSleep sleeps;
};

TEST_F(LogManagerRefreshTest, BuildsOneObjectPerValidLine) {
    configure("# logs\n" + a + " ;Y ;U ;%s ${@}\nrelative.log\n" + b + "\n" + c + " ; ;A\n" + b +
              " ;Y\n");
    start();
    EXPECT_THAT(logs(), ElementsAre(a, b, c));
    EXPECT_THAT(AgentDoubles::created(),
                ElementsAre("U " + a + " %s " + a, "S " + b + " ", "A " + c + " "));
    EXPECT_EQ(manager->findLogObject(a.c_str())->debugMode(), 'Y');
    EXPECT_EQ(manager->findLogObject(b.c_str())->debugMode(), 'N');
    EXPECT_EQ(AgentDoubles::living(), 3);
}

TEST_F(LogManagerRefreshTest, AnUnchangedConfigurationKeepsAllObjects) {
    trace.setLevel(TRC1_DETAIL);
    configure(a + "\n" + b + "\n");
    start();
    LogFile* const first = manager->findLogObject(a.c_str());
    refresh();
    EXPECT_THAT(messages(), ElementsAre("Refresh signal received.", hasNotChanged(config),
                                        "Continuing to monitor existing log files.", waiting));
    EXPECT_EQ(manager->findLogObject(a.c_str()), first);
    EXPECT_THAT(logs(), ElementsAre(a, b));
    EXPECT_EQ(AgentDoubles::created().size(), 2U);
}

TEST_F(LogManagerRefreshTest, ALineTouchedButNotChangedKeepsItsObject) {
    configure(a + " ;N ;U ;%s\n");
    start();
    LogFile* const first = manager->findLogObject(a.c_str());
    configure("# touched\n" + a + " ;N ;U ;%s\n");
    refresh();
    EXPECT_EQ(manager->findLogObject(a.c_str()), first);
    EXPECT_FALSE(first->isMarked());
    EXPECT_EQ(AgentDoubles::created().size(), 1U);
}

TEST_F(LogManagerRefreshTest, AChangedDebugModeUpdatesTheObject) {
    configure(a + " ;N\n");
    start();
    LogFile* const first = manager->findLogObject(a.c_str());
    EXPECT_EQ(first->debugMode(), 'N');
    configure(a + " ;Y\n");
    refresh();
    EXPECT_EQ(manager->findLogObject(a.c_str()), first);
    EXPECT_EQ(first->debugMode(), 'Y');
}

TEST_F(LogManagerRefreshTest, AChangedProcedureReplacesTheObject) {
    configure(a + " ;N ;U ;%s\n" + b + "\n");
    start();
    configure(a + " ;N ;U ;%d\n" + b + "\n");
    refresh();
    EXPECT_THAT(AgentDoubles::created(),
                ElementsAre("U " + a + " %s", "S " + b + " ", "U " + a + " %d"));
    EXPECT_STREQ(manager->findLogObject(a.c_str())->procedure(), "%d");
    EXPECT_THAT(logs(), ElementsAre(b, a));
    EXPECT_EQ(AgentDoubles::living(), 2);
    EXPECT_TRUE(trace.contains("Deleting log object for file " + a + "."));
    EXPECT_FALSE(trace.contains("Deleting log object for file " + b + "."));
}

TEST_F(LogManagerRefreshTest, ARemovedProcedureReplacesTheObject) {
    configure(a + " ;N ;U ;%s\n");
    start();
    configure(a + " ;N ;U\n");
    refresh();
    EXPECT_THAT(AgentDoubles::created(), ElementsAre("U " + a + " %s", "U " + a + " "));
    EXPECT_THAT(logs(), ElementsAre(a));
}

TEST_F(LogManagerRefreshTest, AChangedTypeReplacesTheObject) {
    configure(a + " ;N ;S\n");
    start();
    configure(a + " ;N ;A\n");
    refresh();
    EXPECT_EQ(manager->findLogObject(a.c_str())->type(), 'A');
    EXPECT_THAT(logs(), ElementsAre(a));
    EXPECT_EQ(AgentDoubles::living(), 1);
}

TEST_F(LogManagerRefreshTest, ARemovedLineDeletesItsObject) {
    configure(a + "\n" + b + "\n" + c + "\n");
    start();
    LogFile* const last = manager->findLogObject(c.c_str());
    configure(c + "\n");
    refresh();
    EXPECT_THAT(logs(), ElementsAre(c));
    EXPECT_EQ(manager->getNextLogObject(nullptr, 0), last);
    EXPECT_EQ(AgentDoubles::living(), 1);
    EXPECT_THAT(messagesThatBegin({"Deleting"}),
                ElementsAre("Deleting log object for file " + a + ".",
                            "Deleting log object for file " + b + "."));
}

TEST_F(LogManagerRefreshTest, ReplacingAllLinesRebuildsTheChain) {
    configure(a + "\n");
    start();
    configure(b + "\n" + c + "\n");
    refresh();
    EXPECT_THAT(logs(), ElementsAre(b, c));
    EXPECT_EQ(AgentDoubles::living(), 2);
}

TEST_F(LogManagerRefreshTest, ARefreshHoldsTheManagerAndDumpsItInTheDetailClass) {
    configure(a + "\n");
    start();
    configure(b + "\n");
    refresh();
    std::vector<std::string> steps =
        messagesThatBegin({"Log manager", "Deleting", "Refresh", "Manager", "\n\tthis\t\t\t\t="});
    ASSERT_EQ(steps.size(), 6U);
    EXPECT_TRUE(steps[4].starts_with("\n\tthis\t\t\t\t= "));
    steps.erase(steps.begin() + 4);
    EXPECT_THAT(steps, ElementsAre("Refresh signal received.", "Log manager locked.",
                                   "Deleting log object for file " + a + ".",
                                   "Log manager unlocked.", waiting));
}

TEST_F(LogManagerRefreshTest, ARefreshWaitsForTwoOpenRequests) {
    const std::string suspended = "Refresh suspended pending completion of outstanding requests.";
    configure(a + "\n");
    start();
    configure(b + "\n");
    manager->beginRequest();
    manager->beginRequest();
    trace.clear();
    EXPECT_FALSE(manager->isRefreshWaiting());
    kill(getpid(), SIGHUP);
    ASSERT_TRUE(trace.waitFor(suspended));
    EXPECT_TRUE(manager->isRefreshWaiting());
    manager->endRequest();
    EXPECT_FALSE(trace.contains("Refresh resuming."));
    EXPECT_EQ(manager->getNextLogObject(nullptr, 0)->fileNameLocal(), a);
    EXPECT_EQ(AgentDoubles::created().size(), 1U);
    manager->endRequest();
    ASSERT_TRUE(trace.waitFor(waiting));
    EXPECT_TRUE(trace.contains("Refresh resuming."));
    EXPECT_FALSE(manager->isRefreshWaiting());
    EXPECT_THAT(logs(), ElementsAre(b));
}

TEST_F(LogManagerRefreshTest, ARefreshWithoutRequestsTracesNoWait) {
    configure(a + "\n");
    start();
    configure(b + "\n");
    refresh();
    EXPECT_THAT(messagesThatBegin({"Refresh"}), ElementsAre("Refresh signal received."));
}

TEST_F(LogManagerRefreshTest, AFailedWaitForRequestsIsTracedAndRepeated) {
    configure(a + "\n");
    start();
    configure(b + "\n");
    manager->beginRequest();
    trace.clear();
    {
        Fault fault("pthread_cond_wait", EINVAL, {.times = 2});
        kill(getpid(), SIGHUP);
        ASSERT_TRUE(waitUntil([&] { return fault.calls() > 2; }));
    }
    manager->endRequest();
    ASSERT_TRUE(trace.waitFor(waiting));
    const std::string suspended = "Refresh suspended pending completion of outstanding requests.";
    const std::string failed = "Error blocking on the manager-not-in-use condition variable. "
                               "Return code = 22; Invalid argument";
    EXPECT_THAT(messagesThatBegin({"Refresh", "Error"}),
                ElementsAre("Refresh signal received.", suspended, failed, suspended, failed,
                            suspended, "Refresh resuming."));
}

TEST_F(LogManagerRefreshTest, WithoutConfigurationThereIsNothingToDo) {
    configureSyslog("*.err " + a + "\n");
    trace.setLevel(TRC1_ERROR);
    runWithoutLogs();
    EXPECT_THAT(trace.messages(), ElementsAre("Agent has no work to do.  Exiting..."));
    EXPECT_EQ(sleeps.requested(), 60U);
    EXPECT_THAT(AgentDoubles::created(), IsEmpty());
}

TEST_F(LogManagerRefreshTest, AMissingConfigurationFallsBackToTheSyslogConfiguration) {
    setenv("ZRM_CONFIG_FILE", config.c_str(), 1);
    configureSyslog("*.err " + a + "\n*.alert root\n");
    trace.setLevel(TRC1_ERROR);
    manager = std::make_unique<LogManager>();
    ASSERT_TRUE(waitUntil([&] { return manager->numLogs() == 1; }));
    EXPECT_THAT(trace.messages(), ElementsAre("stat() command failed for " + config +
                                                  " errno = 2; No such file or directory.",
                                              "Attempting to build default list from syslog file " +
                                                  syslogConfig + "."));
    EXPECT_THAT(AgentDoubles::created(), ElementsAre("S " + a + " "));
    EXPECT_EQ(sleeps.requested(), 0U);
}

TEST_F(LogManagerRefreshTest, AMissingSyslogConfigurationYieldsNothing) {
    configure("# nothing\n");
    trace.setLevel(TRC1_ERROR);
    runWithoutLogs();
    EXPECT_THAT(trace.messages(),
                ElementsAre("No valid log files found in " + config +
                                ".  Attempting to build default list from syslog file " +
                                syslogConfig + ".",
                            "stat() command failed for " + syslogConfig +
                                " errno = 2; No such file or directory.",
                            "Agent has no work to do.  Exiting..."));
}

TEST_F(LogManagerRefreshTest, ASyslogConfigurationWithoutLogsYieldsNothing) {
    configure("# nothing\n");
    configureSyslog("*.alert root\n");
    trace.setLevel(TRC1_ERROR);
    runWithoutLogs();
    EXPECT_THAT(trace.messages(),
                ElementsAre("No valid log files found in " + config +
                                ".  Attempting to build default list from syslog file " +
                                syslogConfig + ".",
                            "No valid log files found in " + syslogConfig + ".",
                            "Agent has no work to do.  Exiting..."));
}

TEST_F(LogManagerRefreshTest, AnEmptiedConfigurationFallsBackToTheSyslogConfiguration) {
    configureSyslog("*.err " + b + "\n");
    configure(a + "\n");
    start();
    EXPECT_THAT(logs(), ElementsAre(a));
    configure("\n");
    refresh();
    EXPECT_THAT(logs(), ElementsAre(b));
}

TEST_F(LogManagerRefreshTest, AnEmptiedConfigurationWithoutAFallbackKeepsTheLogs) {
    configure(a + "\n");
    start();
    configure("\n");
    refresh();
    EXPECT_TRUE(trace.contains("Continuing to monitor existing log files."));
    EXPECT_THAT(logs(), ElementsAre(a));
    EXPECT_EQ(sleeps.requested(), 0U);
}

TEST_F(LogManagerRefreshTest, AnUnchangedSyslogConfigurationKeepsAllObjects) {
    trace.setLevel(TRC1_DETAIL);
    configure("\n");
    configureSyslog("*.err " + a + "\n");
    start();
    refresh();
    EXPECT_TRUE(
        trace.contains(syslogConfig + " has not changed since last refresh. No refresh performed"));
    EXPECT_FALSE(trace.contains(hasNotChanged(syslogConfig)));
    EXPECT_EQ(AgentDoubles::created().size(), 1U);
}

TEST_F(LogManagerRefreshTest, ASwitchBetweenTheSourcesAlwaysRebuilds) {
    configureSyslog("*.err " + b + "\n");
    configure(a + "\n");
    start();
    rename(config.c_str(), directory.file("away").c_str());
    refresh();
    EXPECT_THAT(logs(), ElementsAre(b));
    // The same unchanged file comes back and disappears again.
    rename(directory.file("away").c_str(), config.c_str());
    refresh();
    EXPECT_THAT(logs(), ElementsAre(a));
    rename(config.c_str(), directory.file("away").c_str());
    refresh();
    EXPECT_THAT(logs(), ElementsAre(b));
}

class LogManagerRefreshDeathTest : public LogManagerRefreshTest {
protected:
    LogManagerRefreshDeathTest() {
        GTEST_FLAG_SET(death_test_style, "fast");
        trace.setLevel(TRC1_ERROR);
    }
    /// Creates a manager that ends the process.
    [[noreturn]] void run() {
        manager = std::make_unique<LogManager>();
        waitForEnd();
    }
};

TEST_F(LogManagerRefreshDeathTest, RunningOutOfMemoryForAValidLogEndsTheProcess) {
    configure(a + "\n");
    EXPECT_EXIT(
        {
            // Two paths, then the reader's buffer, then the log.
            Fault fault("new", ENOMEM, {.skip = 3});
            run();
        },
        ExitedWithCode(255),
        "^Memory allocation for ValidLog object failed\\.  Agent is terminating\\.\n$");
}

TEST_F(LogManagerRefreshDeathTest, RunningOutOfMemoryForALogEndsTheProcess) {
    configure(a + "\n");
    EXPECT_EXIT(
        {
            AgentDoubles::setLogsCreatable(false);
            run();
        },
        ExitedWithCode(255),
        "^Memory allocation for LogFile object failed\\.  Agent is terminating\\.\n$");
}

TEST_F(LogManagerRefreshDeathTest, ALogOfUnknownTypeEndsTheProcess) {
    configure(a + " ; ;A\n");
    EXPECT_EXIT(
        {
            AgentDoubles::setTypesKnown(false);
            run();
        },
        ExitedWithCode(255),
        "^Error during refresh processing\\. Unknown log type 65 encountered for file " + a +
            "\\. Log not monitored\\.\nFatal error during refresh processing\\. No\\. of valid "
            "logs = 1: No\\. of actual logs = 0\\. Agent is terminating\\.\n$");
}

} // namespace
