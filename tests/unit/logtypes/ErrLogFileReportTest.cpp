#include "logtypes/ErrLogFile.h"

#include "ErrLogTest.h"
#include "monitor/ReportOutcome.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <cerrno>
#include <csignal>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <thread>

using namespace zrm;

namespace {

using testing::Contains;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr const char* endless =
    "while :; do echo 'A924A5FC   1004030306 P S SYSPROC endless'; done";

class ErrLogFileReportTest : public ErrLogTest {
protected:
    // The monitor's own command ends immediately: reports do not need it.
    ErrLogFileReportTest() {
        EXPECT_TRUE(waitUntil([&] { return trace.messages().size() == 1; }));
        m_monitor->stopThread();
        trace.clear();
        DebugLogRecorder::clear();
        setenv("PATH", (directory.path().string() + ":" + m_path).c_str(), 1);
    }
    ~ErrLogFileReportTest() override { setenv("PATH", m_path.c_str(), 1); }

    /// Puts an "errpt" on the search path that stores its arguments and then runs `script`.
    void installErrpt(const std::string& script) const {
        const std::string program =
            directory.write("errpt", "#!/bin/sh\nfor word in \"$@\"; do echo \"$word\"; done > " +
                                         directory.file("arguments") + "\n" + script + "\n");
        std::filesystem::permissions(program, std::filesystem::perms::owner_all);
    }
    std::string arguments() const {
        std::ostringstream text;
        text << std::ifstream(directory.file("arguments")).rdbuf();
        return text.str();
    }
    /// An "errpt" that writes this text.
    void installOutput(const std::string& text) const { installErrpt(printing(text)); }

    std::vector<std::string> report(_RequestThresholds thresholds, std::size_t limit = 1000) {
        void* state = m_monitor->startReportRequest(&thresholds);
        if (state == nullptr) {
            return {"no report"};
        }
        std::vector<std::string> descriptions;
        zrm_rmlogent_data_t row;
        while (descriptions.size() < limit) {
            void* const found = m_monitor->getNextLogEntry(&row, state, &thresholds);
            if (found == nullptr) {
                break;
            }
            EXPECT_EQ(found, &row);
            descriptions.push_back(columnText(row.entrydesc));
        }
        m_monitor->endReportRequest(&state);
        EXPECT_EQ(state, nullptr);
        return descriptions;
    }
    std::vector<std::string> report() { return report(october()); }
    static _RequestThresholds october() { return window("1061005070309000", "1061031235959000"); }
    std::string terminated(const std::string& how) const {
        return "Report command errpt -s1005070306 -e1031235906 ( pid = N ) for file " + log +
               " has terminated " + how;
    }
    ErrLogFile& monitor() { return *m_monitor; }

private:
    const std::string m_path = std::getenv("PATH");
    const std::unique_ptr<ErrLogFile> m_monitor = start("exit");
};

TEST_F(ErrLogFileReportTest, ReturnsTheCommandsLinesWithoutTheHeader) {
    installOutput(std::string(header) + entry + otherEntry);
    EXPECT_THAT(report(), ElementsAre("A924A5FC: SOFTWARE PROGRAM ABNORMALLY TERMINATED",
                                      "BFE4C025: UNDETERMINED ERROR"));
    EXPECT_EQ(arguments(), "-s1005070306\n-e1031235906\n");
    EXPECT_THAT(trace.messages(), IsEmpty());
    EXPECT_THAT(DebugLogRecorder::records(), IsEmpty());
    EXPECT_TRUE(hasNoChild());
}

TEST_F(ErrLogFileReportTest, WithoutBothTimesAsksForEverything) {
    installOutput(std::string(header) + entry);
    for (const auto& thresholds :
         {window("", "1061031235959000"), window("1061005070309000", ""), window("", "")}) {
        trace.setLevel(TRC1_DETAIL);
        trace.clear();
        EXPECT_EQ(report(thresholds).size(), 1U);
        EXPECT_EQ(arguments(), "");
        EXPECT_THAT(masked(trace.messages()),
                    Contains("Report command errpt   ( pid = N ) for file " + log +
                             " has terminated normally; exit status = 0"));
        EXPECT_THAT(masked(trace.childMessages()),
                    ElementsAre("Child process for report on file " + log +
                                " about to exec \"errpt  \"; redirecting fd N (stdout) to pipe; "
                                "closing fd's N & N."));
    }
}

TEST_F(ErrLogFileReportTest, TracesItsChildInTheDetailClass) {
    installOutput(header);
    trace.setLevel(TRC1_DETAIL);
    EXPECT_THAT(report(), IsEmpty());
    const std::string readFd = std::to_string(numberAfter("; read fd = "));
    const std::string writeFd = std::to_string(numberAfter("; write fd = "));
    const std::string pid = std::to_string(childId());
    EXPECT_THAT(
        trace.messages(),
        ElementsAre("Pipe opened successfully for file " + log + "; read fd = " + readFd +
                        "; write fd = " + writeFd,
                    "Parent process closing write fd " + writeFd + ".",
                    "Child process created for report on file " + log + ". pid = " + pid + ".",
                    "Read end of pipe closed successfully.",
                    "Report command errpt -s1005070306 -e1031235906 ( pid = " + pid +
                        " ) for file " + log + " has terminated normally; exit status = 0"));
    EXPECT_THAT(trace.childMessages(),
                ElementsAre("Child process for report on file " + log +
                            " about to exec \"errpt -s1005070306 -e1031235906\"; redirecting fd 1 "
                            "(stdout) to pipe; closing fd's " +
                            readFd + " & " + writeFd + "."));
}

TEST_F(ErrLogFileReportTest, ConvertsTimeStamps) {
    char text[11];
    ErrLogFile::timestamp2ErrlogTime(text, "1061005070309000");
    EXPECT_STREQ(text, "1005070306");
    ErrLogFile::timestamp2ErrlogTime(text, "0991231235959000");
    EXPECT_STREQ(text, "1231235999");
}

TEST_F(ErrLogFileReportTest, IsEmptyWhenTheCommandWritesNothing) {
    installOutput("");
    EXPECT_THAT(report(), IsEmpty());
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(ErrLogFileReportTest, EndsAtALineThatIsNotAnEntry) {
    installOutput(std::string(header) + entry + "no entry\n" + otherEntry);
    EXPECT_EQ(report().size(), 1U);
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error while formatting line for report on file " + log + "."));
    EXPECT_THAT(DebugLogRecorder::records(),
                ElementsAre(DebugLogRecorder::Record{"no entry\n", ""}));
}

TEST_F(ErrLogFileReportTest, ReportsWhyItEnds) {
    const auto endOf = [this](const std::string& output) {
        installOutput(output);
        const ReportOutcome outcome;
        report();
        return outcome.end();
    };
    EXPECT_EQ(endOf(std::string(header) + entry), ReportEnd::complete);
    EXPECT_EQ(endOf(std::string(header) + entry + "no entry\n"), ReportEnd::notAnEntry);
    installErrpt("exit 3");
    const ReportOutcome outcome;
    report();
    EXPECT_EQ(outcome.end(), ReportEnd::commandFailed);
}

TEST_F(ErrLogFileReportTest, TreatsTheRestOfALongLineAsALine) {
    std::string text = entry;
    text.pop_back();
    text.resize(255, 'x');
    installOutput(header + text + "yyy\n" + otherEntry);
    EXPECT_THAT(report(), ElementsAre(testing::StartsWith("A924A5FC: SOFTWARE PROGRAM")));
    EXPECT_THAT(DebugLogRecorder::records(), ElementsAre(DebugLogRecorder::Record{"yyy\n", ""}));
}

TEST_F(ErrLogFileReportTest, WhenEndedEarlyLeavesAWritingCommandABrokenPipe) {
    installErrpt(endless);
    const auto oldPipe = std::signal(SIGPIPE, SIG_IGN);
    EXPECT_EQ(report(october(), 3).size(), 3U);
    std::signal(SIGPIPE, oldPipe);
    EXPECT_EQ(errors().size() + masked(trace.childMessages()).size(), 1U);
    EXPECT_THAT(errors(), Contains(terminated("abnormally; signal number = 13")));
    EXPECT_TRUE(hasNoChild());
}

TEST_F(ErrLogFileReportTest, WithoutTheProgramReturnsNoRowAndTracesHowTheChildEnded) {
    setenv("PATH", directory.path().c_str(), 1);
    trace.setLevel(TRC1_ERROR | TRC1_DETAIL);
    EXPECT_THAT(report(), IsEmpty());
    EXPECT_THAT(masked(trace.messages()), Contains(terminated("normally; exit status = 255")));
    EXPECT_THAT(trace.childMessages(),
                Contains("Error executing command errpt -s1005070306 -e1031235906 for report on "
                         "file  " +
                         log +
                         ". errno = 2; No such file or directory.  Use the error number and "
                         "message to investigate the failure.  Agent is terminating."));
}

TEST_F(ErrLogFileReportTest, DoesNotStartWithoutMemory) {
    installOutput(std::string(header) + entry);
    {
        const Fault fault("new", ENOMEM);
        EXPECT_THAT(report(), ElementsAre("no report"));
    }
    EXPECT_THAT(trace.messages(), ElementsAre("Memory allocation for 296 bytes failed. errno = 12; "
                                              "Cannot allocate memory"));
}

TEST_F(ErrLogFileReportTest, ContinuesWithoutMemoryForTheCommandsText) {
    installOutput(std::string(header) + entry);
    trace.setLevel(TRC1_ERROR | TRC1_DETAIL);
    const Fault fault("new", ENOMEM, {.skip = 1});
    EXPECT_EQ(report().size(), 1U);
    EXPECT_THAT(errors(), Contains("Memory allocation for 34 bytes failed. errno = 12; Cannot "
                                   "allocate memory"));
    EXPECT_THAT(errors(), Contains("Report command  ( pid = N ) for file " + log +
                                   " has terminated normally; exit status = 0"));
}

TEST_F(ErrLogFileReportTest, DoesNotStartWithoutAPipe) {
    const Fault fault("pipe", EMFILE);
    EXPECT_THAT(report(), ElementsAre("no report"));
    EXPECT_THAT(trace.messages(), ElementsAre("Error creating pipe for file " + log +
                                              ". errno = 24; Too many open files"));
    EXPECT_EQ(monitor().monitorStatus(), MONITOR_ERR_CREATE_PIPE);
}

TEST_F(ErrLogFileReportTest, DoesNotStartWithoutAChild) {
    const int descriptors = openDescriptors();
    const Fault fault("fork", EAGAIN);
    EXPECT_THAT(report(), ElementsAre("no report"));
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error creating child process for report on file " + log +
                            ". errno = 11; Resource temporarily unavailable"));
    EXPECT_EQ(openDescriptors(), descriptors);
}

TEST_F(ErrLogFileReportTest, DoesNotStartWithoutAStream) {
    installErrpt(endless);
    const int descriptors = openDescriptors();
    const Fault fault("fdopen", ENOMEM);
    EXPECT_THAT(report(), ElementsAre("no report"));
    EXPECT_EQ(errors().at(0), "Error converting read pipe fd N to file pointer for report on log "
                              "file " +
                                  log + ". errno = 12; Cannot allocate memory");
    // The child, which had no text for its command yet, wrote to a pipe that nobody reads.
    EXPECT_EQ(errors().at(1), "Report command  ( pid = N ) for file " + log +
                                  " has terminated abnormally; signal number = 13");
    EXPECT_EQ(openDescriptors(), descriptors);
    EXPECT_TRUE(hasNoChild());
}

TEST_F(ErrLogFileReportTest, TracesAFailedReadWithOneArgumentTooFew) {
    const UnreadableStreams unreadable;
    installOutput("");
    EXPECT_THAT(report(), IsEmpty());
    EXPECT_EQ(trace.messages().at(0), "Error while reading file " + log +
                                          " for report on file 21. errno = Is a directory; ");
}

TEST_F(ErrLogFileReportTest, KeepsWaitingWhenItsWaitIsInterrupted) {
    installOutput(header);
    const Fault fault("waitpid", EINTR, {.times = 3});
    EXPECT_THAT(report(), IsEmpty());
    EXPECT_EQ(fault.failed(), 3);
    EXPECT_THAT(trace.messages(), IsEmpty());
    EXPECT_TRUE(hasNoChild());
}

TEST_F(ErrLogFileReportTest, TracesAFailedWait) {
    installOutput(header);
    {
        const Fault fault("waitpid", ECHILD);
        EXPECT_THAT(report(), IsEmpty());
    }
    EXPECT_THAT(errors(), ElementsAre("Error waiting for child report process N to terminate for "
                                      "file " +
                                      log + ".errno = 10; No child processes"));
    EXPECT_GT(waitpid(-1, nullptr, 0), 0);
}

TEST_F(ErrLogFileReportTest, EndingWithoutAStateDoesNothing) {
    void* state = nullptr;
    monitor().endReportRequest(&state);
    EXPECT_EQ(state, nullptr);
}

// A child that inherited another report's pipe would keep that report waiting for its own end.
TEST_F(ErrLogFileReportTest, ConcurrentReportsAndMonitorsDoNotDelayEachOther) {
    installOutput(std::string(header) + entry);
    std::vector<std::thread> threads;
    std::atomic<int> rows{0};
    for (int i = 0; i < 3; ++i) {
        threads.emplace_back([&] {
            for (int j = 0; j < 15; ++j) {
                rows += static_cast<int>(report().size());
            }
        });
    }
    std::vector<std::unique_ptr<ErrLogFile>> monitors;
    const auto silent = line("exec sleep 1000");
    for (int i = 0; i < 20; ++i) {
        monitors.push_back(std::make_unique<ErrLogFile>(*silent, nullptr));
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(rows, 45);
    monitors.clear();
    EXPECT_TRUE(hasNoChild());
}

} // namespace
