// What start-up takes from the environment and what it traces of it.

#include "agent/zrmmain.h"

#include "base/ProcessValues.h"
#include "framework/trace.h"
#include "support/Faults.h"
#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <clocale>
#include <cstdlib>
#include <string>
#include <vector>

#include <unistd.h>

using namespace zrm;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class ZrmEnvironmentTest : public testing::Test {
protected:
    ZrmEnvironmentTest() {
        for (const char* name : {"QFW_TRC1", "ZRM_MAX_ROWS", "LANG"}) {
            unsetenv(name);
        }
        setenv("LC_ALL", "C.UTF-8", 1);
        std::setlocale(LC_ALL, "C");
    }
    ~ZrmEnvironmentTest() override {
        unsetenv("LC_ALL");
        unsetenv("QFW_TRC1");
        unsetenv("ZRM_MAX_ROWS");
        std::setlocale(LC_ALL, "C");
    }

    static void check(const char* maxRows) {
        setenv("ZRM_MAX_ROWS", maxRows, 1);
        gMaxRows = -1;
        checkEnvironment();
    }
    static std::string sysconfLine(const std::string& start, int name, const std::string& rest) {
        errno = 0;
        const long value = sysconf(name);
        const char* const suffix = value >= 0 ? "" : errno != 0 ? ">> Error <<" : ">> Undefined <<";
        return "\n" + start + "= " + std::to_string(value) + "\t" + rest + suffix;
    }
    static std::string pathconfLine(const std::string& start, int name, const std::string& rest) {
        errno = 0;
        const long value = pathconf(cwd().c_str(), name);
        const char* const suffix = value >= 0 ? "" : errno != 0 ? ">> Error <<" : ">> No limit <<";
        return "\n" + start + "= " + std::to_string(value) + "\t" + rest + suffix;
    }
    static std::string cwd() {
        char directory[1024];
        return getcwd(directory, sizeof directory);
    }
    static std::vector<std::string> systemLines() {
        return {
            sysconfLine("POSIX_VERSION\t\t", _SC_VERSION, "POSIX version. "),
            "\nCHAR_BIT\t\t= 8\tNo. of bits per char.",
            "\nINT_MAX\t\t\t= 2147483647\tMax. value of int.",
            "\nLONG_MAX\t\t= -1\tMax. value of long.",
            sysconfLine("THREADS\t\t\t", _SC_THREADS, "Thread support provided. "),
            sysconfLine("THREAD_THREADS_MAX\t", _SC_THREAD_THREADS_MAX,
                        "Max. no. threads per process. "),
            "\nSYS1_PTHREAD_DRAFT\t= 199506\tPOSIX thread draft.",
            sysconfLine("ARG_MAX\t\t\t", _SC_ARG_MAX, "Max. length of args to exec(). "),
            sysconfLine("CHILD_MAX\t\t", _SC_CHILD_MAX, "Max. no. processes per real uid. "),
            sysconfLine("OPEN_MAX\t\t", _SC_OPEN_MAX, "Max. no. open files per process. "),
            sysconfLine("STREAM_MAX\t\t", _SC_STREAM_MAX,
                        "Max. no. std. i/o streams per process. "),
            sysconfLine("SAVED_IDS\t\t", _SC_SAVED_IDS,
                        "Implementation support for saved set-id's. "),
            sysconfLine("CLK_TCK\t\t\t", _SC_CLK_TCK, "No. of clock ticks per second. "),
        };
    }
    static std::vector<std::string> pathLines() {
        return {
            "Current working directory is " + cwd() +
                ". The following limits apply to the cwd and to the specific file system to which "
                "it belongs.",
            pathconfLine("PATH_MAX\t\t", _PC_PATH_MAX, "Max. length of relative pathname. "),
            pathconfLine("NAME_MAX\t\t", _PC_NAME_MAX, "Max. length of filename. "),
            pathconfLine("LINK_MAX\t\t", _PC_LINK_MAX, "Max. value of cwd's link count. "),
            pathconfLine("PIPE_BUF\t\t", _PC_PIPE_BUF,
                         "Max. bytes that can be written atomically to a pipe. "),
            pathconfLine("CHOWN_RESTRICTED\t", _PC_CHOWN_RESTRICTED, "Restricted use of chown. "),
        };
    }
    const std::vector<std::string> firstLines{
        "QFW_TRC1 is not defined.", "Maximum Log Entries report rows set to default of 1000."};
    const std::vector<std::string> lastLines{"Current locale categories are C.",
                                             "New locale categories are C.UTF-8."};

    static std::vector<std::string> joined(const std::vector<std::vector<std::string>>& parts) {
        std::vector<std::string> all;
        for (const auto& part : parts) {
            all.insert(all.end(), part.begin(), part.end());
        }
        return all;
    }

    RecordingTrace trace{TRC1_ERROR};
};

TEST_F(ZrmEnvironmentTest, TheTraceConfigurationIsEchoedWhateverTheLevel) {
    trace.setLevel(0);
    checkEnvironment();
    setenv("QFW_TRC1", "error,ValidLog=all", 1);
    checkEnvironment();
    setenv("QFW_TRC1", "", 1);
    checkEnvironment();
    EXPECT_THAT(trace.messages(), ElementsAre("QFW_TRC1 is not defined.",
                                              "QFW_TRC1 = error,ValidLog=all", "QFW_TRC1 = "));
}

TEST_F(ZrmEnvironmentTest, TheRowLimitIsTheLeadingNumber) {
    check("250");
    EXPECT_EQ(gMaxRows, 250);
    check("12abc");
    EXPECT_EQ(gMaxRows, 12);
    check(" 7");
    EXPECT_EQ(gMaxRows, 7);
    EXPECT_THAT(trace.messages(), testing::Each("QFW_TRC1 is not defined."));
    trace.clear();
    trace.setLevel(TRC1_DETAIL);
    check("250");
    EXPECT_THAT(trace.messages(), testing::Contains("Maximum Log Entries report rows set to 250."));
    EXPECT_FALSE(trace.contains("Maximum Log Entries report rows set to default of 250."));
}

TEST_F(ZrmEnvironmentTest, WithoutAUsefulRowLimitThereIsADefault) {
    gMaxRows = -1;
    checkEnvironment();
    EXPECT_EQ(gMaxRows, 1000);
    check("");
    EXPECT_EQ(gMaxRows, 1000);
    EXPECT_THAT(trace.messages(), testing::Each("QFW_TRC1 is not defined."));
    for (const std::string text : {"0", "-5", "abc"}) {
        trace.clear();
        check(text.c_str());
        EXPECT_EQ(gMaxRows, 1000);
        EXPECT_THAT(trace.messages(), ElementsAre("QFW_TRC1 is not defined.",
                                                  "Error converting ZRM_MAX_ROWS value of " + text +
                                                      " to integer; using default value."));
    }
}

TEST_F(ZrmEnvironmentTest, ARefusedRowLimitIsFollowedByTheDefault) {
    trace.setLevel(TRC1_DETAIL | TRC1_ERROR);
    check("abc");
    const auto messages = trace.messages();
    ASSERT_GE(messages.size(), 3U);
    EXPECT_EQ(messages[1],
              "Error converting ZRM_MAX_ROWS value of abc to integer; using default value.");
    EXPECT_EQ(messages[2], "Maximum Log Entries report rows set to default of 1000.");
}

TEST_F(ZrmEnvironmentTest, WithoutTheDetailClassOnlyTheLocaleIsSet) {
    trace.setLevel(TRC1_ERROR | TRC1_FINE | TRC1_FLOW);
    checkEnvironment();
    EXPECT_STREQ(std::setlocale(LC_ALL, nullptr), "C.UTF-8");
    EXPECT_THAT(trace.messages(), ElementsAre("QFW_TRC1 is not defined."));
}

TEST_F(ZrmEnvironmentTest, TheDetailClassTracesAllLimitsAndTheLocale) {
    trace.setLevel(TRC1_DETAIL);
    checkEnvironment();
    EXPECT_EQ(trace.messages(), joined({firstLines, systemLines(), pathLines(), lastLines}));
    EXPECT_STREQ(std::setlocale(LC_ALL, nullptr), "C.UTF-8");
}

TEST_F(ZrmEnvironmentTest, ALocaleThatTheSystemDoesNotHaveIsTracedAsUnknown) {
    setenv("LC_ALL", "xx_XX.NONE", 1);
    trace.setLevel(TRC1_DETAIL);
    checkEnvironment();
    EXPECT_EQ(trace.messages().back(), "New locale categories are unknown.");
}

TEST_F(ZrmEnvironmentTest, WithoutCurrentDirectoryThePathLimitsAreSkipped) {
    trace.setLevel(TRC1_DETAIL | TRC1_ERROR);
    {
        Fault fault("getcwd", EACCES);
        checkEnvironment();
    }
    EXPECT_EQ(trace.messages(),
              joined({firstLines,
                      systemLines(),
                      {"Error calling getcwd(); array size is 1025. errno = 13; Permission denied"},
                      lastLines}));
    trace.clear();
    trace.setLevel(TRC1_DETAIL);
    std::setlocale(LC_ALL, "C");
    Fault fault("getcwd", EACCES);
    checkEnvironment();
    EXPECT_EQ(trace.messages(), joined({firstLines, systemLines(), lastLines}));
}

TEST_F(ZrmEnvironmentTest, AMissingPosixVersionIsReplacedByAConstant) {
    trace.setLevel(TRC1_DETAIL);
    Fault fault("sysconf", EINVAL);
    checkEnvironment();
    const auto messages = trace.messages();
    EXPECT_EQ(messages[2], "\nPOSIX_VERSION\t\t= -1\tPOSIX version. >> Error <<");
    EXPECT_EQ(messages[3], "\nPOSIX_VERSION\t\t= 199506\tPOSIX version. >> constant displayed <<");
    EXPECT_EQ(messages[4], "\nCHAR_BIT\t\t= 8\tNo. of bits per char.");
}

TEST_F(ZrmEnvironmentTest, AMissingPathLengthIsReplacedByAConstant) {
    trace.setLevel(TRC1_DETAIL);
    Fault fault("pathconf", EINVAL);
    checkEnvironment();
    const auto messages = trace.messages();
    ASSERT_EQ(messages.size(), firstLines.size() + 13 + 7 + lastLines.size());
    EXPECT_EQ(messages[16], "\nPATH_MAX\t\t= -1\tMax. length of relative pathname. >> Error <<");
    EXPECT_EQ(messages[17],
              "\nPATH_MAX\t\t= 1024\tMax. length of relative pathname. >> constant displayed <<");
    EXPECT_EQ(messages[18],
              pathconfLine("NAME_MAX\t\t", _PC_NAME_MAX, "Max. length of filename. "));
}

TEST_F(ZrmEnvironmentTest, ALimitIsTracedAndReturnedWhateverTheLevel) {
    trace.setLevel(0);
    EXPECT_EQ(printSysconfLimit("%ld %s", _SC_CLK_TCK), sysconf(_SC_CLK_TCK));
    EXPECT_EQ(printPathconfLimit("%ld %s", _PC_NAME_MAX, "/"), pathconf("/", _PC_NAME_MAX));
    EXPECT_THAT(trace.messages(), ElementsAre(std::to_string(sysconf(_SC_CLK_TCK)) + " ",
                                              std::to_string(pathconf("/", _PC_NAME_MAX)) + " "));
}

TEST_F(ZrmEnvironmentTest, ALimitThatTheSystemDoesNotHaveIsMarked) {
    trace.setLevel(TRC1_ERROR);
    ASSERT_EQ(sysconf(_SC_THREAD_THREADS_MAX), -1);
    errno = EINVAL; // of an earlier call
    EXPECT_EQ(printSysconfLimit("%ld %s", _SC_THREAD_THREADS_MAX), -1);
    ASSERT_EQ(pathconf("/", _PC_SYMLINK_MAX), -1);
    errno = EINVAL;
    EXPECT_EQ(printPathconfLimit("%ld %s", _PC_SYMLINK_MAX, "/"), -1);
    EXPECT_THAT(trace.messages(), ElementsAre("-1 >> Undefined <<", "-1 >> No limit <<"));
}

TEST_F(ZrmEnvironmentTest, ALimitThatCannotBeQueriedIsAnError) {
    EXPECT_EQ(printSysconfLimit("%ld %s", 9999), -1);
    EXPECT_EQ(printPathconfLimit("%ld %s", _PC_NAME_MAX, "/missing"), -1);
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error calling sysconf() for limit 9999.  errno = 22; Invalid argument",
                            "-1 >> Error <<",
                            "Error calling pathconf() for limit " + std::to_string(_PC_NAME_MAX) +
                                ".  errno = 2; No such file or directory",
                            "-1 >> Error <<"));
    trace.clear();
    trace.setLevel(TRC1_DETAIL | TRC1_FINE);
    EXPECT_EQ(printSysconfLimit("%ld %s", 9999), -1);
    EXPECT_THAT(trace.messages(), ElementsAre("-1 >> Error <<"));
}

} // namespace
