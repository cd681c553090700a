// What a start makes of files that changed while the agent was stopped.
#include "host/sources/EarlierRun.h"

#include "host/base/TimeText.h"
#include "host/events/EntryEvents.h"
#include "host/events/EventQueue.h"
#include "host/events/PositionBook.h"
#include "host/sources/LogFinder.h"
#include "monitor/Generation.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <memory>
#include <set>
#include <string>
#include <vector>

using namespace zrm;
using namespace zrm::host;
namespace fs = std::filesystem;

namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::IsEmpty;

class EarlierRunTest : public testing::Test {
protected:
    std::string file(const std::string& name) { return directory.file(name); }
    /// Creates a file that was last written so many seconds ago.
    std::string create(const std::string& name, int secondsAgo = 0,
                       const std::string& text = "x\n") {
        const std::string path = directory.write(name, text);
        fs::last_write_time(path,
                            fs::file_time_type::clock::now() - std::chrono::seconds(secondsAgo));
        return path;
    }
    /// The earlier run has read the file so far, as a log of this name.
    void read(const std::string& path, const std::string& log) {
        const std::unique_ptr<Generation> opened = Generation::open(path);
        const auto size = static_cast<std::int64_t>(fs::file_size(path));
        Tail tail;
        ASSERT_TRUE(opened->readTail(size, tail));
        stored.logs.push_back({log, positionOf(opened->identity(), size, tail)});
    }
    void watched(const std::string& path, int secondsAgo) {
        stored.paths.push_back({path, WallClock::now() - 1000 * secondsAgo});
    }
    void table(const std::string& path, bool resumes = true) {
        LogConfig log;
        log.paths = {path};
        log.follow.resume = resumes;
        logs.push_back(log);
    }
    void begin() {
        finder = std::make_unique<LogFinder>(EarlierRun(PositionBook(stored, true), monitored));
        look();
    }
    void look() { found = finder->look(logs, {}, now); }
    std::vector<std::string> names() const {
        std::vector<std::string> list;
        for (const FurtherLog& log : found.logs) {
            list.push_back(log.name);
        }
        return list;
    }
    /// The logs that are read from their beginnings if they have no position.
    std::vector<std::string> newcomers() const {
        std::vector<std::string> list;
        for (const FurtherLog& log : found.logs) {
            if (log.settings->isNewcomer) {
                list.push_back(log.name);
            }
        }
        return list;
    }

    TemporaryDirectory directory;
    PositionValues stored;
    std::set<std::string> monitored;
    std::vector<LogConfig> logs;
    std::unique_ptr<LogFinder> finder;
    LogFinder::Clock::time_point now{};
    FoundLogs found;
};

TEST_F(EarlierRunTest, AFileThatAppearedUnderAWatchedGlobIsNew) {
    create("old.log", 100);
    const std::string young = create("young.log", 10);
    watched(file("*.log"), 50);
    table(file("*.log"));
    begin();
    EXPECT_THAT(newcomers(), ElementsAre(young));
    look();
    EXPECT_THAT(newcomers(), ElementsAre(young));
}

TEST_F(EarlierRunTest, AFileThatAppearedAtAWatchedPathIsNew) {
    const std::string path = create("app.log", 10);
    watched(path, 50);
    table(path);
    begin();
    EXPECT_THAT(newcomers(), ElementsAre(path));
}

TEST_F(EarlierRunTest, APathThatWasNotWatchedObeysTheConfiguration) {
    create("app.log", 10);
    watched(file("*.txt"), 50);
    table(file("*.log"));
    begin();
    EXPECT_THAT(newcomers(), IsEmpty());
}

TEST_F(EarlierRunTest, AFileThatTheEarlierRunExcludedIsNotNew) {
    create("noisy.log", 10);
    const std::string young = create("young.log", 10);
    watched(file("*.log"), 100);
    watched(file("*.log") + "\nother.log\nnoisy.*", 50);
    watched(file("*.log2"), 1);
    table(file("*.log"));
    begin();
    EXPECT_THAT(newcomers(), ElementsAre(young));
}

TEST_F(EarlierRunTest, ATableThatIsBackKnowsUntilWhenItWasWatched) {
    watched(file("*.log"), 1000);
    table(file("*.log"));
    begin();
    const std::vector<LogConfig> tables = std::exchange(logs, {});
    look();
    const auto book = std::make_shared<PositionBook>(PositionValues{}, true);
    PositionBook::makeCurrent(book);
    book->paths().note(file("*.log"), WallClock::now() - 50'000);
    create("old.log", 100); // moved there
    const std::string young = create("young.log", 10);
    logs = tables;
    look();
    PositionBook::makeCurrent(PositionBook::unkept());
    EXPECT_THAT(newcomers(), ElementsAre(young));
}

TEST_F(EarlierRunTest, WithoutResumptionNothingOfTheEarlierRunCounts) {
    create("app.log", 10);
    watched(file("*.log"), 50);
    table(file("*.log"), false);
    begin();
    EXPECT_THAT(newcomers(), IsEmpty());
}

TEST_F(EarlierRunTest, AFileThatWasALineOfTheLogConfigurationIsNotNew) {
    monitored = {create("app.log", 10)};
    watched(file("*.log"), 50);
    table(file("*.log"));
    begin();
    EXPECT_THAT(newcomers(), IsEmpty());
}

TEST_F(EarlierRunTest, AClockThatWasSetBackPassesNothingOver) {
    const std::string path = create("app.log", 100);
    watched(file("*.log"), -1000);
    table(file("*.log"));
    begin();
    EXPECT_THAT(newcomers(), ElementsAre(path));
}

TEST_F(EarlierRunTest, ARotatedFileIsReadAsTheLogThatItWas) {
    const std::string log = create("app.log", 0, "one\n");
    read(log, log);
    watched(file("*"), 50);
    table(file("*"));
    fs::rename(log, file("kept-app"));
    create("app.log", 0, "two\n");
    begin();
    EXPECT_THAT(names(), ElementsAre(log));
    look();
    EXPECT_THAT(names(), ElementsAre(log));
}

TEST_F(EarlierRunTest, ALogWithoutASuccessorIsReadToItsEnd) {
    const std::string log = create("app.log", 0, "one\n");
    const std::string other = create("other.log", 100);
    read(log, log);
    watched(file("*.log"), 50);
    table(file("*.log"));
    fs::rename(log, file("app.log.1"));
    begin();
    EXPECT_THAT(names(), ElementsAre(log, other));
    now += LogFinder::keptAbsent + 1s;
    look();
    EXPECT_THAT(names(), ElementsAre(other));
}

TEST_F(EarlierRunTest, ALogThatRotationHasMovedIsReadToItsEnd) {
    fs::create_directory(file("old"));
    const std::string log = create("app.log", 0, "one\n");
    read(log, log);
    watched(file("*.log"), 50);
    watched(file("old/*"), 50);
    table(file("*.log"));
    table(file("old/*"));
    logs[0].follow.rotatedTo = "old";
    fs::rename(log, file("old/app.log.1"));
    begin();
    EXPECT_THAT(names(), ElementsAre(log));
}

TEST_F(EarlierRunTest, ALogThatIsGoneIsNotFollowed) {
    const std::string log = create("app.log", 0, "one\n");
    const std::string other = create("other.log", 100);
    read(log, log);
    fs::remove(log);
    table(file("*.log"));
    begin();
    EXPECT_THAT(names(), ElementsAre(other));
}

TEST_F(EarlierRunTest, OlderGenerationsOfALogThatIsGoneAreNotReadAgain) {
    const std::string log = create("app.log", 0, "one\n");
    create("app.log.1", 100);
    const std::string young = create("app.log-20261122", 10);
    read(log, log);
    fs::remove(log);
    watched(file("*"), 50);
    table(file("*"));
    begin();
    EXPECT_THAT(names(), ElementsAre(young));
    look();
    EXPECT_THAT(names(), ElementsAre(young));
}

TEST_F(EarlierRunTest, AnotherFileWithTheSameInodeIsNew) {
    const std::string log = create("app-1.log", 0, "one\n");
    read(log, log);
    watched(file("*.log"), 50);
    table(file("*.log"));
    // The same inode with other contents stands for one that was used again.
    fs::rename(log, file("app-2.log"));
    directory.write("app-2.log", "two\n");
    create("app-1.log", 100, "one\n");
    begin();
    EXPECT_THAT(newcomers(), ElementsAre(file("app-2.log")));
}

class NoteLookTest : public EarlierRunTest {
protected:
    void note(std::int64_t time) {
        look();
        EarlierRun::noteLook(*book, logs, found, time);
    }
    std::int64_t watchedUntil(const std::string& path) const {
        const auto paths = book->paths().all();
        const auto found = paths.find(path);
        return found == paths.end() ? 0 : found->second;
    }
    void store(const std::string& log) {
        const auto followed = book->log(log);
        EntryEvents nothing;
        followed->reached(followed->begin(), {1, 2, 3, 4, 5, 6}, nothing);
        book->saved(book->unsaved(0));
    }

    std::shared_ptr<PositionBook> book = std::make_shared<PositionBook>(PositionValues{}, true);
};

TEST_F(NoteLookTest, APathIsWatchedOnceEachOfItsFilesHasAStoredPosition) {
    const std::string a = create("a.log");
    const std::string b = create("b.log");
    const std::string glob = file("*.log");
    table(glob);
    begin();
    note(1);
    store(a);
    note(2);
    EXPECT_EQ(watchedUntil(glob), 0);
    store(b);
    note(3);
    EXPECT_EQ(watchedUntil(glob), 3);
    create("c.log");
    note(4);
    EXPECT_EQ(watchedUntil(glob), 3);
}

TEST_F(NoteLookTest, AFileWithoutAPositionKeepsOnlyItsOwnPathFromBeingWatched) {
    const std::string a = create("a.log");
    const std::string b = create("b.txt");
    table(file("*.log"));
    logs[0].paths.push_back(b);
    begin();
    store(a);
    note(1);
    EXPECT_EQ(watchedUntil(file("*.log")), 1);
    EXPECT_EQ(watchedUntil(b), 0);
}

TEST_F(NoteLookTest, AFileThatTheLogManagerLeavesOutNeedsNoPosition) {
    const std::string a = create("a.log");
    const std::string b = create("b.log");
    const std::string glob = file("*.log");
    table(glob);
    begin();
    store(a);
    FurtherLogs::noteLeftOut({b});
    note(1);
    EXPECT_EQ(watchedUntil(glob), 1);
    FurtherLogs::noteLeftOut({});
    note(2);
    EXPECT_EQ(watchedUntil(glob), 1);
}

TEST_F(NoteLookTest, ExclusionsAreNoted) {
    table(file("*.log"));
    logs[0].excludes = {"a.*", "/b"};
    begin();
    note(1);
    EXPECT_EQ(watchedUntil(file("*.log") + "\na.*\n/b"), 1);
    EXPECT_EQ(watchedUntil(file("*.log")), 0);
}

TEST_F(NoteLookTest, APathWithoutAFileIsWatched) {
    table(file("later.log"));
    begin();
    note(1);
    EXPECT_EQ(watchedUntil(file("later.log")), 1);
}

TEST_F(NoteLookTest, AnUnreadableDirectoryDoesNotKeepAPathFromBeingWatched) {
    const std::string a = create("a.log");
    table(file("*.log"));
    begin();
    store(a);
    look();
    found.sources.front().problem = "The directory /var/log/private cannot be read";
    EarlierRun::noteLook(*book, logs, found, 1);
    EXPECT_EQ(watchedUntil(file("*.log")), 1);
}

TEST_F(NoteLookTest, WithoutResumptionNoPathIsWatched) {
    table(file("*.log"), false);
    begin();
    note(1);
    EXPECT_EQ(watchedUntil(file("*.log")), 0);
}

} // namespace
