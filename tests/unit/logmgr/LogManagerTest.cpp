// The log manager's environment, life, requests, debug log and state dump.

#include "LogManagerFixture.h"

#include "AgentDoubles.h"
#include "monitor/LogFile.h"
#include "support/Faults.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <cstdio>
#include <ctime>
#include <fstream>
#include <sstream>

#include <fcntl.h>
#include <unistd.h>

using namespace zrm;

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::ElementsAreArray;
using testing::HasSubstr;
using testing::IsEmpty;

constexpr const char* messagesOfDefaults[] = {
    "No ZRM_CONFIG_FILE environment variable specified.",
    "No ZRM_SYSLOG_CONF environment variable specified; using default file /etc/syslog.conf.",
    "No \"AGENT_DEBUG_LOG\" environment variable specified. Agent debug mode is OFF."};

/// A manager that monitors one log, or, in its variants, none.
class LogManagerTest : public LogManagerFixture {
protected:
    std::vector<std::string> environmentMessages() {
        return messagesThatBegin({"No ZRM", "No \"AGENT", "\""});
    }
    std::string content(const std::string& path) const {
        std::ostringstream text;
        text << std::ifstream(path).rdbuf();
        return text.str();
    }
    FakeSleep sleeps;
};

TEST_F(LogManagerTest, ReadsItsEnvironment) {
    configure(a + "\n");
    setDebugLog(directory.file("debug.log"));
    start();
    EXPECT_THAT(
        environmentMessages(),
        ElementsAre("\"ZRM_CONFIG_FILE\" environment variable set to \"" + config + "\"",
                    "\"ZRM_SYSLOG_CONF\" environment variable set to \"" + syslogConfig + "\"",
                    "\"AGENT_DEBUG_LOG\" environment variable set to \"" +
                        directory.file("debug.log") + "\". Agent debug mode is ON."));
}

TEST_F(LogManagerTest, HasDefaultsForAnUnsetEnvironment) {
    manager = std::make_unique<LogManager>();
    EXPECT_THAT(environmentMessages(), ElementsAreArray(messagesOfDefaults));
    manager->printSelf();
    EXPECT_THAT(trace.messages(),
                Contains(HasSubstr("SyslogConfFile\t\t\t= \"/etc/syslog.conf\"")));
}

TEST_F(LogManagerTest, TreatsEmptyEnvironmentVariablesAsUnset) {
    for (const char* name : {"ZRM_CONFIG_FILE", "ZRM_SYSLOG_CONF", "AGENT_DEBUG_LOG"}) {
        setenv(name, "", 1);
    }
    manager = std::make_unique<LogManager>();
    EXPECT_THAT(environmentMessages(), ElementsAreArray(messagesOfDefaults));
}

TEST_F(LogManagerTest, TracesItsStartAndStopInTheDetailClass) {
    trace.setLevel(TRC1_DETAIL);
    configure(a + "\n");
    start();
    trace.clear();
    manager.reset();
    EXPECT_THAT(messagesThatBegin({"Shutdown", "Term", "Manager", "Log manager", "'", "Del"}),
                ElementsAre("Shutdown commencing.",
                            "Termination pending cancelation of manager thread.",
                            "Manager thread terminated.", "Log manager mutex destroyed.",
                            "'inuse' condition variable destroyed.",
                            "'server-up' condition variable destroyed.",
                            "Deleting log object for file " + a + "."));
    EXPECT_EQ(AgentDoubles::living(), 0);
    EXPECT_THAT(trace.messages().back(), HasSubstr("\n\tConfigFile\t\t\t= \"\"\n"));
    EXPECT_THAT(trace.messages().back(), HasSubstr("\tNumLogs\t\t\t\t= 0\n"));
}

TEST_F(LogManagerTest, TracesTheStartOfItsMutexAndConditions) {
    trace.setLevel(TRC1_DETAIL);
    configure(a + "\n");
    start();
    EXPECT_THAT(messagesThatBegin({"Log manager "}),
                ElementsAre("Log manager mutex initialized.",
                            "Log manager 'inuse' condition variable initialized.",
                            "Log manager 'server-up' condition variable initialized.",
                            "Log manager thread successfully started.", "Log manager locked.",
                            "Log manager unlocked."));
}

TEST_F(LogManagerTest, TracesNoErrorIfNothingFails) {
    trace.setLevel(TRC1_ERROR);
    configure(a + "\n");
    manager = std::make_unique<LogManager>();
    ASSERT_TRUE(waitUntil([&] { return manager->numLogs() == 1; }));
    manager->beginRequest();
    manager->setServerUp();
    manager->endRequest();
    manager.reset();
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(LogManagerTest, ContinuesIfItsThreadCannotBeMadeJoinable) {
    trace.setLevel(TRC1_ERROR);
    Fault fault("pthread_attr_setdetachstate", EINVAL);
    configure(a + "\n");
    manager = std::make_unique<LogManager>();
    ASSERT_TRUE(waitUntil([&] { return manager->numLogs() == 1; }));
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error making log manager thread attribute object joinable. Return "
                            "code = 22; Invalid argument.  Continuing."));
}

TEST_F(LogManagerTest, DumpsItselfAtTheStartInTheFineClass) {
    trace.setLevel(TRC1_FINE);
    configure(a + "\n");
    manager = std::make_unique<LogManager>();
    EXPECT_THAT(trace.messages(), Contains(HasSubstr("\n\tConfigFile\t\t\t= \"" + config)));
}

TEST_F(LogManagerTest, DumpsAllFieldsWhateverTheLevel) {
    configure(a + "\n");
    setDebugLog(directory.file("debug.log"));
    start();
    trace.clear();
    trace.setLevel(0);
    manager->beginRequest();
    manager->printSelf();
    const std::time_t epoch = 0;
    char expected[1024];
    std::snprintf(
        expected, sizeof expected,
        "\n\tthis\t\t\t\t= %p\n\tConfigFile\t\t\t= \"%s\"\n\tConfigFileLastChanged\t\t= %s"
        "\tSyslogConfFile\t\t\t= \"%s\"\n\tSyslogConfFileLastChanged\t= %s\tNumLogs\t\t\t\t= 1\n"
        "\tFirstLogObject\t\t\t= %p\n\tFirstValidLog\t\t\t= %p\n\tUseCount\t\t\t= 1\n"
        "\tManagerThread\t\t\t= \n\tManagerLock\t\t\t= \n\tManagerNotInUse\t\t\t= \n"
        "\tAgentServerUp\t\t\t= 0\n\tAgentServerNotUp\t\t= \n\tDebugLog\t\t\t= \"%s\"\n"
        "\tDebugLogP\t\t\t= %p\n",
        static_cast<void*>(manager.get()), config.c_str(), std::ctime(&epoch), syslogConfig.c_str(),
        std::ctime(&epoch), static_cast<void*>(manager->getNextLogObject(nullptr, 0)),
        static_cast<void*>(nullptr), directory.file("debug.log").c_str(),
        static_cast<void*>(debugLogStream()));
    EXPECT_THAT(trace.messages(), ElementsAre(expected));
    manager->endRequest();
}

TEST_F(LogManagerTest, BothDumpedTimesAreThatOfTheSyslogConfiguration) {
    configure("# empty\n");
    configureSyslog("*.err " + a + "\n");
    start();
    trace.clear();
    manager->printSelf();
    const std::time_t changed = 1000000001;
    const std::string text = std::ctime(&changed);
    EXPECT_THAT(trace.messages().back(), HasSubstr("\tConfigFileLastChanged\t\t= " + text));
    EXPECT_THAT(trace.messages().back(), HasSubstr("\tSyslogConfFileLastChanged\t= " + text));
}

TEST_F(LogManagerTest, ATimeThatHasNoTextIsEmptyInTheDump) {
    configure(a + "\n");
    start();
    const Fault fault("ctime_r", EOVERFLOW);
    manager->printSelf();
    EXPECT_THAT(trace.messages().back(), HasSubstr("LastChanged\t\t= \tSyslogConfFile\t"));
    EXPECT_THAT(trace.messages().back(), HasSubstr("SyslogConfFileLastChanged\t= \tNumLogs\t"));
}

TEST_F(LogManagerTest, CountsRequests) {
    configure(a + "\n");
    start();
    trace.clear();
    trace.setLevel(TRC1_DETAIL);
    manager->beginRequest();
    manager->beginRequest();
    manager->endRequest();
    manager->endRequest();
    EXPECT_THAT(trace.messages(),
                ElementsAre("Log manager locked.", "Use count is now 1.", "Log manager unlocked.",
                            "Log manager locked.", "Use count is now 2.", "Log manager unlocked.",
                            "Log manager locked.", "Use count is now 1.", "Log manager unlocked.",
                            "Log manager locked.", "Not-in-use signal sent.",
                            "Log manager unlocked."));
}

TEST_F(LogManagerTest, RepairsAUseCountThatWouldGoNegative) {
    configure(a + "\n");
    start();
    trace.clear();
    trace.setLevel(TRC1_ERROR);
    manager->endRequest();
    EXPECT_THAT(trace.messages(),
                ElementsAre("Use count going negative. Current value is -1. Setting to 0"));
    trace.clear();
    trace.setLevel(TRC1_DETAIL);
    manager->endRequest();
    manager->beginRequest();
    EXPECT_THAT(trace.messages(),
                ElementsAre("Log manager locked.", "Log manager unlocked.", "Log manager locked.",
                            "Use count is now 1.", "Log manager unlocked."));
    manager->endRequest();
}

TEST_F(LogManagerTest, TracesAFailedBroadcast) {
    configure(a + "\n");
    start();
    trace.clear();
    trace.setLevel(TRC1_ERROR);
    manager->beginRequest();
    Fault fault("pthread_cond_broadcast", EINVAL);
    manager->endRequest();
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error signaling condition variable. errno = 22; Invalid argument"));
}

TEST_F(LogManagerTest, TheServerMayBeReportedUpMoreThanOnce) {
    configure(a + "\n");
    start();
    trace.clear();
    manager->setServerUp();
    manager->setServerUp();
    EXPECT_THAT(trace.messages(),
                ElementsAre("Log manager locked.", "Agent server is listening; signal sent.",
                            "Log manager unlocked.", "Log manager locked.",
                            "Agent server is listening; signal sent.", "Log manager unlocked."));
    manager->printSelf();
    EXPECT_THAT(trace.messages().back(), HasSubstr("\tAgentServerUp\t\t\t= 1\n"));
}

TEST_F(LogManagerTest, TracesAFailedServerUpSignal) {
    configure(a + "\n");
    start();
    trace.clear();
    trace.setLevel(TRC1_ERROR);
    Fault fault("pthread_cond_signal", EINVAL);
    manager->setServerUp();
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error signaling server-up condition variable.  Return code = 22; "
                            "Invalid argument"));
}

TEST_F(LogManagerTest, AnEmptyManagerHasNoLogs) {
    manager = std::make_unique<LogManager>();
    trace.waitFor("Agent has no work to do.  Exiting...");
    trace.setLevel(TRC1_DETAIL);
    EXPECT_EQ(manager->getNextLogObject(nullptr, 0), nullptr);
    EXPECT_EQ(manager->findLogObject(a.c_str()), nullptr);
    EXPECT_TRUE(trace.contains("No logs are currently being monitored."));
    manager->setServerUp();
}

TEST_F(LogManagerTest, AChainOfThreeReturnsEachLogOnce) {
    configure(a + "\n" + b + "\n" + c + "\n");
    start();
    EXPECT_THAT(logs(), ElementsAre(a, b, c));
    EXPECT_EQ(manager->numLogs(), 3U);
}

TEST_F(LogManagerTest, AChainLongerThanItsCountEndsTheWalk) {
    configure(a + "\n" + b + "\n");
    start();
    trace.clear();
    trace.setLevel(TRC1_ERROR);
    LogFile* const first = manager->getNextLogObject(nullptr, 0);
    const auto stranger = strangerBehind(first);
    LogFile* const second = manager->getNextLogObject(first, 1);
    EXPECT_NE(second, nullptr);
    EXPECT_EQ(manager->getNextLogObject(second, 2), nullptr);
    EXPECT_THAT(trace.messages(), ElementsAre("Log object chain corrupted. Request terminating."));
}

TEST_F(LogManagerTest, FindsALogByItsExactLocalName) {
    configure(a + "\n" + b + "\n");
    start();
    ASSERT_NE(manager->findLogObject(b.c_str()), nullptr);
    EXPECT_EQ(manager->findLogObject(b.c_str())->fileNameLocal(), b);
    EXPECT_EQ(manager->findLogObject(c.c_str()), nullptr);
    EXPECT_EQ(manager->findLogObject((b + "x").c_str()), nullptr);
    EXPECT_EQ(manager->findLogObject(""), nullptr);
}

TEST_F(LogManagerTest, TheDebugLogIsAppendedLineByLineAndNotInherited) {
    const std::string path = directory.write("debug.log", "before\n");
    configure(a + "\n");
    setDebugLog(path);
    start();
    std::FILE* const stream = debugLogStream();
    ASSERT_NE(stream, nullptr);
    EXPECT_EQ(fcntl(fileno(stream), F_GETFD, 0) & FD_CLOEXEC, FD_CLOEXEC);
    std::fputs("line\npart", stream);
    EXPECT_EQ(content(path), "before\nline\n");
    refresh();
    EXPECT_EQ(debugLogStream(), stream);
    manager.reset();
    EXPECT_EQ(content(path), "before\nline\npart");
}

TEST_F(LogManagerTest, WithoutItsVariableThereIsNoDebugLog) {
    configure(a + "\n");
    start();
    EXPECT_EQ(debugLogStream(), nullptr);
}

TEST_F(LogManagerTest, ADebugLogThatCannotBeOpenedIsTriedAgainAtTheNextRefresh) {
    const std::string path = directory.file("missing/debug.log");
    configure(a + "\n");
    setDebugLog(path);
    trace.setLevel(TRC1_ERROR);
    manager = std::make_unique<LogManager>();
    ASSERT_TRUE(waitUntil([&] { return manager->numLogs() == 1; }));
    EXPECT_THAT(trace.messages(), ElementsAre("Error opening debug log \"" + path +
                                              "\"; errno = 2; No such file or directory"));
    EXPECT_EQ(debugLogStream(), nullptr);
    std::filesystem::create_directory(directory.file("missing"));
    trace.setLevel(TRC1_DETAIL);
    refresh();
    EXPECT_NE(debugLogStream(), nullptr);
}

} // namespace
