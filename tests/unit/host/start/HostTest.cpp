#include "framework/agent_calls.h"
#include "support/Faults.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"
#include "unit/host/framework/TestTable.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <chrono>
#include <cstdio>
#include <cstdlib>
#include <fstream>
#include <iterator>
#include <string>
#include <thread>
#include <vector>

#include <fcntl.h>
#include <unistd.h>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;

TestManager& entries() {
    static auto* const table = new TestManager("RMLOGENT");
    return *table;
}

bool hasLogs = true;

/// Two tables, and one log unless a test removes it.
int loadTables() {
    static auto* const logs = new TestManager("RMMONLOG");
    logs->onCreate = [](TestRequest& created) {
        created.onSample = [](TestRequest& request) {
            TestRow row("/var/log/", "app.log", "Running", 0);
            if (hasLogs) {
                request.InsertRow(row.bytes());
            }
        };
    };
    TableManager::RegisterWithManager(logs);
    return static_cast<int>(TableManager::RegisterWithManager(&entries()));
}

int loadNothing() {
    return 0;
}

/// Waits until there are situations and offers each of them a row.
void arrive(std::size_t situations = 1) {
    while (entries().linked().size() != situations) {
        std::this_thread::sleep_for(1ms);
    }
    SYS1_GetLock(entries().lock());
    LinkedListIter walk(entries().requests());
    while (void* const element = walk.Next()) {
        TestRow row("/var/log/", "app.log", "text", 7);
        auto* const request = static_cast<ctreq*>(element);
        request->InsertRow(row.bytes());
        request->Dispatch();
        request->count = 0;
    }
    SYS1_ReleaseLock(entries().lock());
}

class HostTest : public testing::Test {
protected:
    HostTest() {
        GTEST_FLAG_SET(death_test_style, "threadsafe");
        for (const char* const variable : {"ZRM_CONFIG_FILE", "ZRM_MAX_ROWS", "QFW_TRC1"}) {
            unsetenv(variable);
        }
        // The child of a death test runs the test from its beginning, in the parent's directory.
        if (!testing::internal::InDeathTestChild()) {
            setenv("HOST_TEST_DIRECTORY", own.path().c_str(), 1);
        }
        directory = std::getenv("HOST_TEST_DIRECTORY");
    }

    /// What SYS1_Main does with these arguments.
    void start(std::vector<std::string> arguments) const {
        if (arguments.empty()) {
            arguments = {"--config", write(state())};
        }
        arguments.insert(arguments.begin(), "zrmagent");
        std::vector<char*> pointers;
        for (std::string& argument : arguments) {
            pointers.push_back(argument.data());
        }
        pointers.push_back(nullptr);
        int count = static_cast<int>(arguments.size());
        SYS1_Main(&count, pointers.data(), "zrmagent");
    }
    /// Starts with a configuration that writes events to output(), and runs the main loop.
    int run(const std::string& situations = "[[situation]]\nname = 'every'\n",
            int (*loader)() = loadTables) {
        start({"--config", write(sink() + situations)});
        AGF_RegisterAgentLoader(loader);
        return agfmain(0, nullptr);
    }
    static void stop() {
        unsigned status = 1;
        RPC1_Shutdown(&status);
        if (status != 0) {
            std::_Exit(99);
        }
    }
    int lines() const {
        std::ifstream stream(output());
        return static_cast<int>(std::count(std::istreambuf_iterator<char>(stream), {}, '\n'));
    }

    RecordingTrace trace{TRC1_ERROR};
    TemporaryDirectory own;
    std::string directory;
    /// Writes the configuration file and returns its path.
    std::string write(const std::string& text) const {
        std::ofstream(directory + "/zrm.toml") << text;
        return directory + "/zrm.toml";
    }
    /// Keeps the history in the test's directory.
    std::string state() const { return "state_directory = '" + directory + "/state'\n"; }
    std::string sink() const {
        return state() + "[[sink]]\ntype = 'jsonl'\npath = '" + output() + "'\n";
    }
    /// From here on standard error goes to a file, where this process and its parent can read it.
    void errorsToFile() const {
        const int fd = open((directory + "/errors").c_str(), O_WRONLY | O_CREAT | O_APPEND, 0600);
        dup2(fd, STDERR_FILENO);
        close(fd);
    }
    std::string errors() const {
        std::ifstream stream(directory + "/errors");
        return {std::istreambuf_iterator<char>(stream), {}};
    }
    void waitForError(const std::string& text) const {
        while (errors().find(text) == std::string::npos) {
            std::this_thread::sleep_for(5ms);
        }
    }
    std::string output() const { return directory + "/events.jsonl"; }
};

TEST_F(HostTest, HelpAndVersionEndTheProcess) {
    EXPECT_EXIT(start({"--help"}), testing::ExitedWithCode(0), "");
    EXPECT_EXIT(start({"--version"}), testing::ExitedWithCode(0), "");
}

TEST_F(HostTest, AnUnusableCommandLineEndsTheProcess) {
    EXPECT_EXIT(start({"--frob"}), testing::ExitedWithCode(2),
                "^zrmagent: unknown argument '--frob'; zrmagent --help lists the arguments\n$");
    EXPECT_EXIT(start({"--trace-file", "/no/such/trace"}), testing::ExitedWithCode(2),
                "^zrmagent: cannot open /no/such/trace: No such file or directory\n$");
}

TEST_F(HostTest, AnUnusableConfigurationEndsTheProcessWithEveryProblem) {
    const std::string file = write("a = 1\nb = 2\n");
    const std::string keys =
        "unknown key; the keys here are state_directory, agent, http, history, formats, rules, "
        "sink, log, situation, use\n";
    EXPECT_EXIT(start({"--config", file}), testing::ExitedWithCode(2),
                "^zrmagent: " + file + ":1: a: " + keys + "zrmagent: " + file + ":2: b: " + keys +
                    "$");
    EXPECT_EXIT(start({"--config", "/no/such.toml"}), testing::ExitedWithCode(2),
                "^zrmagent: /no/such.toml: cannot be read: No such file or directory; make it a "
                "file that the agent may read, of at most 4 MiB\n$");
}

TEST_F(HostTest, TheConfigurationSetsWhatTheEnvironmentLeavesOpen) {
    setenv("ZRM_MAX_ROWS", "25", 1);
    start({"--config", write(state() + "[agent]\nlog_config = '/etc/logs.conf'\n"
                                       "max_rows = 50\ntrace = 'detail'\n")});
    EXPECT_STREQ(std::getenv("ZRM_CONFIG_FILE"), "/etc/logs.conf");
    EXPECT_STREQ(std::getenv("ZRM_MAX_ROWS"), "25");
    EXPECT_STREQ(std::getenv("QFW_TRC1"), "detail");
}

TEST_F(HostTest, UnusableTraceLevelsOfTheEnvironmentAreReported) {
    setenv("QFW_TRC1", "loud", 1);
    testing::internal::CaptureStderr();
    start({"--config", write(state())});
    EXPECT_THAT(testing::internal::GetCapturedStderr(),
                testing::MatchesRegex("zrmagent: QFW_TRC1: .*; only errors are traced\n"));
}

TEST_F(HostTest, TheVersionIsWritten) {
    char version[9] = {};
    AGF_SetVersionUsingProduct("RM", version, sizeof version);
    EXPECT_THAT(version, testing::MatchesRegex("[0-9]+\\.[0-9]+\\.[0-9]+"));
    AGF_SetAffinity("product");
}

TEST_F(HostTest, RunsUntilAStopIsRequestedAndDeliversEverything) {
    // In a process of its own, which the watchdog would end some seconds later.
    EXPECT_EXIT(
        {
            std::thread([] {
                arrive();
                arrive();
                stop();
            }).detach();
            const int status = run();
            AGF_Shutdown(1);
            AGF_Shutdown(1);
            std::_Exit(trace.messages().empty() ? status : 97);
        },
        testing::ExitedWithCode(0), "");
    EXPECT_EQ(lines(), 2);
}

TEST_F(HostTest, WithoutTheTableItFails) {
    EXPECT_EXIT(std::exit(run("", loadNothing)), testing::ExitedWithCode(255),
                "The agent has not registered its Log Entries table.");
}

TEST_F(HostTest, AnExitOnAnotherThreadDeliversWhatIsQueued) {
    EXPECT_EXIT(
        {
            std::atexit([] { AGF_Shutdown(1); });
            std::thread([] {
                for (int count = 0; count < 100; ++count) {
                    arrive();
                }
                std::exit(3);
            }).detach();
            run();
            std::_Exit(98); // the main loop must not return
        },
        testing::ExitedWithCode(3), "");
    EXPECT_EQ(lines(), 100);
}

TEST_F(HostTest, AnExitBeforeTheMainLoopNeedsNothing) {
    EXPECT_EXIT(
        {
            std::atexit([] { AGF_Shutdown(1); });
            start({"--config", write(state())});
            std::exit(4);
        },
        testing::ExitedWithCode(4), "");
}

TEST_F(HostTest, AChangedFileChangesTheSituationsAndABrokenOneDoesNot) {
    EXPECT_EXIT(
        {
            errorsToFile();
            std::thread([this] {
                arrive(1);
                write(sink() +
                      "[[situation]]\nname = 'every'\n[[situation]]\nname = 'b'\n[http]\n");
                arrive(2);
                write("broken");
                waitForError("was not loaded");
                arrive(2);
                stop();
            }).detach();
            std::exit(run());
        },
        testing::ExitedWithCode(0), "");
    EXPECT_EQ(lines(), 5);
    const std::string file = directory + "/zrm.toml";
    EXPECT_THAT(errors(), testing::MatchesRegex(
                              "zrmagent: " + file +
                              ": logs and situations are reloaded; every other change takes "
                              "effect at the next start\nzrmagent: " +
                              file + ":1: .*; correct the TOML here\nzrmagent: " + file +
                              " was not loaded; the situations and the logs stay as they were\n"));
}

TEST_F(HostTest, ATruncatedFileChangesNothingAndLostSituationsAreReported) {
    const auto situations = [](const std::string& names) {
        std::string text;
        for (const char name : names) {
            text += std::string("[[situation]]\nname = '") + name + "'\n";
        }
        return text;
    };
    EXPECT_EXIT(
        {
            errorsToFile();
            std::thread([&, this] {
                arrive(1);
                write(sink() + situations("abcd"));
                arrive(4);
                write("");
                waitForError("is empty");
                arrive(4);
                write(sink() + situations("a") + "# cut o");
                waitForError("ends within this line");
                arrive(4);
                write(sink() + situations("ab"));
                arrive(2);
                write(sink() + situations("bxyz"));
                arrive(4);
                write(sink() + situations("b"));
                waitForError("are gone");
                arrive(1);
                stop();
            }).detach();
            std::exit(run(situations("a")));
        },
        testing::ExitedWithCode(0), "");
    const std::string file = "zrmagent: " + directory + "/zrm.toml";
    const std::string kept =
        file + " was not loaded; the situations and the logs stay as they were\n";
    EXPECT_EQ(errors(),
              file + ": is empty; write the configuration into it again\n" + kept + file +
                  ":7: the file ends within this line; write the rest of it, or end the line\n" +
                  kept + file +
                  ": 3 of 4 situations are gone and no longer raise events; if the file was cut "
                  "off, write it again\n");
}

TEST_F(HostTest, ReportsOnceThatThereIsNoLogToMonitor) {
    hasLogs = false;
    EXPECT_EXIT(
        {
            errorsToFile();
            std::thread([this] {
                waitForError("no log");
                std::this_thread::sleep_for(1100ms); // one more check of the logs
                stop();
            }).detach();
            std::exit(run());
        },
        testing::ExitedWithCode(0), "");
    EXPECT_EQ(errors(), "zrmagent: no log to monitor: set log_config in " + directory +
                            "/zrm.toml, or ZRM_CONFIG_FILE in the environment, to a file that "
                            "names one log per line; exiting in a minute\n");
}

TEST_F(HostTest, ReportsWhichFileNamesNoLog) {
    hasLogs = false;
    EXPECT_EXIT(
        {
            errorsToFile();
            std::thread([this] {
                waitForError("no log");
                stop();
            }).detach();
            std::exit(run("[agent]\nlog_config = '/etc/zrm/logs.conf'\n"));
        },
        testing::ExitedWithCode(0), "");
    EXPECT_EQ(errors(),
              "zrmagent: no log to monitor: /etc/zrm/logs.conf names none that can be "
              "monitored, and 'zrmctl check /etc/zrm/logs.conf' says why; exiting in a minute\n");
}

TEST_F(HostTest, RunsWithoutItsExitRoutine) {
    EXPECT_EXIT(
        {
            Fault fault("atexit", ENOMEM);
            std::thread([] {
                arrive();
                stop();
            }).detach();
            std::_Exit(run());
        },
        testing::ExitedWithCode(0), "^Error establishing the host's exit routine.\n$");
    EXPECT_EQ(lines(), 1);
}

} // namespace
