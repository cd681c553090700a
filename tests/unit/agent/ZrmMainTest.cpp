// The life of the agent's process. zrmMain blocks signals and registers an exit routine, so it runs
// in children of death tests.

#include "agent/zrmmain.h"

#include "FrameworkDouble.h"
#include "base/ProcessValues.h"
#include "framework/trace.h"
#include "logmgr/LogManager.h"
#include "support/Faults.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <cstdlib>
#include <string>

#include <unistd.h>

using namespace zrm;

namespace {

using testing::ElementsAre;
using testing::ExitedWithCode;
using testing::HasSubstr;
using testing::Not;

class ZrmMainTest : public testing::Test {
protected:
    ZrmMainTest() {
        for (const char* name : {"QFW_TRC1", "ZRM_MAX_ROWS", "ZRM_CONFIG_FILE", "ZRM_SYSLOG_CONF",
                                 "AGENT_DEBUG_LOG", "CTREQ_NODETYPE"}) {
            unsetenv(name);
        }
        FrameworkDouble::clear();
    }
    ~ZrmMainTest() override {
        unsetenv("CTREQ_NODETYPE");
        delete[] gSystemName;
        delete[] gHostName;
        gSystemName = gHostName = nullptr;
    }

    RecordingTrace trace{TRC1_ERROR};
};

TEST_F(ZrmMainTest, TheNamesAreThoseOfTheFrameworkAndOfTheSystem) {
    const FakeUname uname("Linux", "web1");
    trace.setLevel(TRC1_FINE);
    getSystemName();
    EXPECT_STREQ(gSystemName, "web1:ZRM");
    EXPECT_STREQ(gHostName, "web1");
    EXPECT_THAT(trace.messages(), ElementsAre("gSystemName = web1:ZRM ; gHostName = web1"));
    EXPECT_THAT(FrameworkDouble::calls(),
                ElementsAre("AGF_SetNodeType ZRM", "DetermineLocalHost 65"));
}

TEST_F(ZrmMainTest, TheNodeTypeOfTheEnvironmentIsKept) {
    setenv("CTREQ_NODETYPE", "", 1);
    getSystemName();
    EXPECT_THAT(FrameworkDouble::calls(), ElementsAre("DetermineLocalHost 65"));
    EXPECT_THAT(trace.messages(), ElementsAre());
}

TEST_F(ZrmMainTest, WithoutUnameTheHostHasAPlaceholderName) {
    Fault fault("uname", EFAULT);
    getSystemName();
    EXPECT_STREQ(gHostName, "-1");
    EXPECT_THAT(trace.messages(),
                ElementsAre("uname() system call failed. errno = 14; Bad address"));
}

TEST_F(ZrmMainTest, ALongNodeNameIsCutTo256Characters) {
    getSystemName();
    setHostName(std::string(257, 'n').c_str());
    EXPECT_EQ(gHostName, std::string(256, 'n'));
    setHostName(std::string(256, 'm').c_str());
    EXPECT_EQ(gHostName, std::string(256, 'm'));
    setHostName("short");
    EXPECT_STREQ(gHostName, "short");
}

TEST_F(ZrmMainTest, TheLoaderDescribesTheAgentAndRegistersItsTables) {
    EXPECT_EQ(loadAgents(), 0);
    EXPECT_THAT(FrameworkDouble::calls(),
                ElementsAre("AGF_SetAffinity ZRM.logs", "AGF_SetAffinity framework.version-2",
                            "AGF_SetAffinity framework.agent-management",
                            "AGF_SetAffinity framework.internationalisation",
                            "AGF_SetAffinity framework.earlier-monitor-parity",
                            "AGF_SetVersionUsingProduct RM 9 zeroed", "zrm_rmmonlog_init",
                            "zrm_rmlogent_init"));
}

class ZrmMainDeathTest : public ZrmMainTest {
protected:
    ZrmMainDeathTest() { GTEST_FLAG_SET(death_test_style, "fast"); }

    [[noreturn]] static void run() {
        std::string program = "zrmagent";
        std::string argument = "--framework";
        char* argv[] = {program.data(), argument.data(), nullptr};
        std::exit(zrmMain(2, argv));
    }
    static constexpr const char* loading =
        "AGF_SetAffinity ZRM.logs\nAGF_SetAffinity framework.version-2\n"
        "AGF_SetAffinity framework.agent-management\n"
        "AGF_SetAffinity framework.internationalisation\n"
        "AGF_SetAffinity framework.earlier-monitor-parity\n"
        "AGF_SetVersionUsingProduct RM 9 zeroed\nzrm_rmmonlog_init\nzrm_rmlogent_init\nloaded 0\n";
};

TEST_F(ZrmMainDeathTest, StartsAndEndsInOrderWithTheMainLoopsStatus) {
    trace.setLevel(0);
    EXPECT_EXIT(
        {
            const FakeSleep sleeps;
            FrameworkDouble::setStatus(7);
            run();
        },
        ExitedWithCode(7),
        std::string("SYS1_Main 2 zrmagent zrmagent\n"
                    "QFW_TRC1 is not defined.\n"
                    "AGF_SetNodeType ZRM\n"
                    "DetermineLocalHost 65 TERM USR1\n"
                    "AGF_RegisterAgentLoader with a log manager\n"
                    "agfmain 1 zrmagent\n") +
            loading + "AGF_Shutdown 1\n");
}

TEST_F(ZrmMainDeathTest, TheLogManagerIsDestroyedBeforeTheFrameworkIsNotified) {
    trace.setLevel(TRC1_DETAIL);
    EXPECT_EXIT(
        {
            const FakeSleep sleeps;
            run();
        },
        ExitedWithCode(0),
        "\nShutdown commencing\\.\n(.|\n)*Manager thread terminated\\.\n(.|\n)*AGF_Shutdown 1\n$");
}

TEST_F(ZrmMainDeathTest, StartUpTracesEntryAndExitInTheFlowClass) {
    trace.setLevel(TRC1_FLOW);
    EXPECT_EXIT(
        {
            const FakeSleep sleeps;
            static RecordingTrace* const recorded = &trace;
            FrameworkDouble::setStatus(7);
            FrameworkDouble::setEnd([] {
                for (const std::string& event : recorded->events()) {
                    if (event.starts_with("zrmmain") || event.starts_with("zrmenv")) {
                        const std::string line = event + ";";
                        [[maybe_unused]] const auto written =
                            write(STDERR_FILENO, line.data(), line.size());
                    }
                }
            });
            run();
        },
        ExitedWithCode(7),
        "AGF_Shutdown 1\nzrmmain\\.cpp entry;zrmenvironment\\.cpp entry;zrmenvironment\\.cpp "
        "exit;zrmmain\\.cpp entry;zrmmain\\.cpp exit;zrmmain\\.cpp entry;zrmmain\\.cpp exit "
        "0;zrmmain\\.cpp exit 7;zrmmain\\.cpp entry;$");
}

TEST_F(ZrmMainDeathTest, AnExitRoutineThatCannotBeRegisteredEndsTheProcess) {
    EXPECT_EXIT(
        {
            Fault fault("atexit", ENOMEM);
            run();
        },
        ExitedWithCode(255),
        "^SYS1_Main 2 zrmagent zrmagent\nQFW_TRC1 is not defined\\.\n"
        "Error establishing exit routine\\.  errno = [0-9]+; [^\n]*\\.  Use the error number and "
        "message to investigate the failure\\.  Agent is terminating\\.\\.\\.\n$");
}

TEST_F(ZrmMainDeathTest, RunningOutOfMemoryForTheSystemNameRunsTheExitRoutine) {
    EXPECT_EXIT(
        {
            Fault fault("new", ENOMEM);
            run();
        },
        ExitedWithCode(255),
        "\nMemory allocation of 65 bytes failed\\. Agent is terminating\\.\nAGF_Shutdown 1\n$");
}

TEST_F(ZrmMainDeathTest, RunningOutOfMemoryForTheHostNameRunsTheExitRoutine) {
    EXPECT_EXIT(
        {
            Fault fault("new", ENOMEM, {.skip = 1});
            run();
        },
        ExitedWithCode(255),
        "\nMemory allocation of 256 bytes failed\\. Agent is terminating\\.\nAGF_Shutdown 1\n$");
}

TEST_F(ZrmMainDeathTest, RunningOutOfMemoryForTheLogManagerRunsTheExitRoutine) {
    EXPECT_EXIT(
        {
            Fault fault("new", ENOMEM, {.skip = 2});
            run();
        },
        ExitedWithCode(255),
        "\nMemory allocation of " + std::to_string(sizeof(LogManager)) +
            " bytes failed\\. Agent is terminating\\.\nAGF_Shutdown 1\n$");
}

TEST_F(ZrmMainDeathTest, AnExitOfTheManagerThreadDestroysItsLogManager) {
    // The server never comes up, and the main loop never returns.
    const TemporaryDirectory directory;
    const std::string log = directory.write("messages", "");
    setenv("ZRM_CONFIG_FILE", directory.write("logs.conf", log + "\n").c_str(), 1);
    trace.setLevel(TRC1_DETAIL);
    EXPECT_EXIT(
        {
            const FakeTimedWait timeOut;
            Fault noPause("select", EINTR, {.times = -1});
            FrameworkDouble::setServerStaysDown();
            run();
        },
        ExitedWithCode(255),
        "\nShutdown commencing\\.\n(.|\n)*\nDeleting log object for file " + log +
            "\\.\n(.|\n)*\nAGF_Shutdown 1\n$");
    unsetenv("ZRM_CONFIG_FILE");
}

} // namespace
