#include "host/sources/CommandSource.h"

#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <csignal>
#include <memory>
#include <string>
#include <thread>
#include <vector>

#include <unistd.h>

using namespace zrm;
using namespace zrm::host;
using testing::ElementsAre;
using testing::IsEmpty;
using testing::StartsWith;

namespace {

using Clock = std::chrono::steady_clock;

class CommandSourceTest : public testing::Test {
protected:
    void beginShell(const std::string& text, bool restarts = false) {
        begin({"/bin/sh", "-c", text}, restarts);
    }
    void begin(std::vector<std::string> arguments, bool restarts = false) {
        CommandConfig config;
        config.arguments = std::move(arguments);
        config.restarts = restarts;
        source =
            std::make_unique<CommandSource>(config, Defined<EntryFormat>(), Defined<LineJoin>());
        reading = source->reading();
        reading->startAt(EntrySource::Reading::Start::end);
    }
    /// Reads this many lines, or until the command has ended.
    std::vector<std::string> lines(std::size_t count) {
        std::vector<std::string> found;
        const auto limit = Clock::now() + std::chrono::seconds(60);
        while (found.size() < count && Clock::now() < limit) {
            if (const char* const line = reading->next()) {
                found.emplace_back(line);
            } else if (!reading->problem().empty()) {
                break;
            } else {
                reading->wait(std::chrono::milliseconds(50));
            }
        }
        return found;
    }
    std::string waitForProblem() {
        lines(1'000'000);
        return reading->problem();
    }
    static bool isGone(pid_t process) {
        const auto limit = Clock::now() + std::chrono::seconds(30);
        while (kill(process, 0) == 0 && Clock::now() < limit) {
            std::this_thread::sleep_for(std::chrono::milliseconds(5));
        }
        return kill(process, 0) != 0;
    }

    TemporaryDirectory directory;
    std::unique_ptr<CommandSource> source;
    std::unique_ptr<EntrySource::Reading> reading;
};

TEST_F(CommandSourceTest, GivesTheLinesOfItsOutput) {
    beginShell("printf 'one\\n\\ntwo\\r\\nthree'");
    EXPECT_THAT(lines(10), ElementsAre("one", "", "two", "three"));
    EXPECT_EQ(reading->position(), "");
}

TEST_F(CommandSourceTest, ALineIsADescriptionOfThePresent) {
    begin({"echo", "text of the line"});
    ASSERT_THAT(lines(1), ElementsAre("text of the line"));
    EntryColumns columns;
    ASSERT_TRUE(reading->read(columns));
    EXPECT_EQ(columns.description, "text of the line");
    EXPECT_FALSE(columns.hasTime) << "the time is the present";
}

TEST_F(CommandSourceTest, SaysHowItEndedAndWhatItSaidLast) {
    beginShell("echo first >&2; echo 'no such device' >&2; exit 3", true);
    EXPECT_EQ(waitForProblem(), "the command ended with status 3, after 'no such device', and is "
                                "started again");
    beginShell("kill -9 $$");
    EXPECT_EQ(waitForProblem(), "the command was ended by SIGKILL, and is not started again");
}

TEST_F(CommandSourceTest, OneThatClosesItsOutputMayEndByItselfOrIsEnded) {
    beginShell("echo one; exec >&-; sleep 0.1; exit 4");
    EXPECT_EQ(waitForProblem(), "the command ended with status 4, and is not started again");
    beginShell("echo $$; exec >&-; echo 'still here' >&2; exec sleep 1000");
    const std::vector<std::string> process = lines(1);
    ASSERT_EQ(process.size(), 1U);
    EXPECT_EQ(waitForProblem(), "the command has closed its output and gone on, so it was ended, "
                                "after 'still here', and is not started again");
    EXPECT_TRUE(isGone(std::stoi(process[0])));
}

TEST_F(CommandSourceTest, SaysWhyItCannotBeStarted) {
    begin({"/nonexistent/program"}, true);
    EXPECT_EQ(waitForProblem(), "the command cannot be started: No such file or directory, and is "
                                "started again");
}

TEST_F(CommandSourceTest, IsStartedAgainAfterAPause) {
    const std::string marks = directory.file("marks");
    beginShell("echo run; echo x >> " + marks, true);
    EXPECT_THAT(lines(1), ElementsAre("run"));
    EXPECT_THAT(waitForProblem(), StartsWith("the command ended with status 0"));
    const auto ended = Clock::now();
    std::vector<std::string> again;
    while (again.empty() && Clock::now() < ended + std::chrono::seconds(60)) {
        reading->wait(std::chrono::milliseconds(50));
        if (const char* const line = reading->next()) {
            again.emplace_back(line);
        }
    }
    EXPECT_THAT(again, ElementsAre("run"));
    EXPECT_GE(Clock::now() - ended, std::chrono::milliseconds(700));
    EXPECT_EQ(reading->problem(), "");
}

TEST_F(CommandSourceTest, IsNotStartedAgainIfItMustNot) {
    beginShell("echo run");
    EXPECT_THAT(lines(5), ElementsAre("run"));
    waitForProblem();
    reading->wait(std::chrono::milliseconds(1200));
    EXPECT_EQ(reading->next(), nullptr);
}

TEST_F(CommandSourceTest, ALongLineIsCutAndTheNextOneIsWhole) {
    beginShell("head -c 1000000 /dev/zero | tr '\\0' x; echo; echo next");
    ASSERT_EQ(lines(1).size(), 1U);
    EXPECT_EQ(reading->text().size(), EntryKeep::longestText);
    EXPECT_TRUE(reading->isTextCut());
    EXPECT_THAT(lines(1), ElementsAre("next"));
    EXPECT_FALSE(reading->isTextCut());
}

TEST_F(CommandSourceTest, EndsWithItsWholeGroup) {
    beginShell("trap '' TERM; sleep 1000 & echo $!; echo $$; wait");
    const std::vector<std::string> processes = lines(2);
    ASSERT_EQ(processes.size(), 2U);
    const auto begun = Clock::now();
    reading.reset();
    EXPECT_LT(Clock::now() - begun, std::chrono::seconds(20));
    for (const std::string& process : processes) {
        EXPECT_TRUE(isGone(std::stoi(process)));
    }
}

TEST_F(CommandSourceTest, ChildrenThatAreLeftBehindEndToo) {
    beginShell("sleep 1000 & echo $!");
    const std::vector<std::string> child = lines(1);
    ASSERT_EQ(child.size(), 1U);
    EXPECT_THAT(waitForProblem(), StartsWith("the command ended with status 0"));
    EXPECT_TRUE(isGone(std::stoi(child[0])));
}

TEST_F(CommandSourceTest, AFloodEndsAtOnce) {
    begin({"yes"});
    EXPECT_EQ(lines(100'000).size(), 100'000U);
    const auto begun = Clock::now();
    reading.reset();
    EXPECT_LT(Clock::now() - begun, std::chrono::seconds(20));
}

TEST_F(CommandSourceTest, AFloodOfErrorsHoldsUpNothing) {
    beginShell("yes error >&2 & sleep 0.2; echo line; sleep 1000");
    EXPECT_THAT(lines(1), ElementsAre("line"));
    const auto remark = reading->takeRemark();
    ASSERT_TRUE(remark);
    EXPECT_EQ(remark->text, "The command says on standard error: 'error'.");
    reading->wait(std::chrono::milliseconds(1));
    EXPECT_FALSE(reading->takeRemark()) << "once is enough";
}

TEST_F(CommandSourceTest, StartsWithNoSignalBlockedAndNoDescriptors) {
    sigset_t blocked;
    sigset_t before;
    sigemptyset(&blocked);
    sigaddset(&blocked, SIGTERM);
    pthread_sigmask(SIG_BLOCK, &blocked, &before);
    int ends[2];
    ASSERT_EQ(pipe(ends), 0); // inherited unless they are closed
    beginShell("grep SigBlk /proc/self/status; ls /proc/self/fd | wc -l");
    EXPECT_THAT(lines(2), ElementsAre("SigBlk:\t0000000000000000", "4")) << "with that of the list";
    close(ends[0]);
    close(ends[1]);
    pthread_sigmask(SIG_SETMASK, &before, nullptr);
}

TEST_F(CommandSourceTest, HasNoPast) {
    begin({"true"});
    EXPECT_EQ(source->past(), nullptr);
    reading->recall("x", std::chrono::seconds(60));
    EXPECT_EQ(reading->next(), nullptr);
}

} // namespace
