#include "host/sources/LogFinder.h"

#include "host/events/PositionBook.h"

#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <filesystem>
#include <map>
#include <string>
#include <vector>

#include <sys/stat.h>
#include <unistd.h>

using namespace zrm;
using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class LogFinderTest : public testing::Test {
protected:
    static LogConfig table(std::vector<std::string> paths, std::vector<std::string> excludes = {}) {
        LogConfig log;
        log.paths = std::move(paths);
        log.excludes = std::move(excludes);
        log.line = 1;
        return log;
    }
    std::string file(const std::string& name) { return directory.file(name); }
    std::string create(const std::string& name) { return directory.write(name, "x\n"); }
    void rename(const std::string& from, const std::string& to) {
        std::filesystem::rename(file(from), file(to));
    }
    void look() { found = finder.look(logs, ownFiles, now); }
    std::vector<std::string> names() const {
        std::vector<std::string> list;
        for (const FurtherLog& log : found.logs) {
            list.push_back(log.name);
        }
        return list;
    }
    bool isNewcomer(const std::string& name) const {
        for (const FurtherLog& log : found.logs) {
            if (log.name == name) {
                return log.settings->isNewcomer;
            }
        }
        ADD_FAILURE() << name << " is not in the list";
        return false;
    }
    /// Why the file is passed over; empty if it is not.
    std::string reason(const std::string& name) const {
        for (const FoundLogs::Source& source : found.sources) {
            for (const FoundLogs::PassedOver& passed : source.passedOver) {
                if (passed.file == name) {
                    return passed.reason;
                }
            }
        }
        return "";
    }

    TemporaryDirectory directory;
    LogFinder finder;
    std::vector<LogConfig> logs;
    std::map<std::string, std::string> ownFiles;
    LogFinder::Clock::time_point now{};
    FoundLogs found;
};

TEST_F(LogFinderTest, APathThatIsNamedNeedNotExist) {
    logs = {table({file("a.log")})};
    look();
    EXPECT_THAT(names(), ElementsAre(file("a.log")));
    create("a.log");
    look();
    EXPECT_THAT(names(), ElementsAre(file("a.log")));
    EXPECT_TRUE(isNewcomer(file("a.log"))); // it begins at its beginning
}

TEST_F(LogFinderTest, AGlobMatchesFilesInEveryDirectory) {
    std::filesystem::create_directories(file("one/logs"));
    std::filesystem::create_directories(file("two/logs"));
    const std::string a = create("one/logs/a.log");
    const std::string b = create("two/logs/b.log");
    create("two/logs/b.txt");
    create("two/logs/.hidden.log");
    logs = {table({file("*/logs/*.log")})};
    look();
    EXPECT_THAT(names(), ElementsAre(a, b));
    EXPECT_THAT(found.sources[0].files, ElementsAre(a, b));
    EXPECT_EQ(found.sources[0].problem, "");
}

TEST_F(LogFinderTest, ExcludesPathsAndNames) {
    const std::string a = create("a.log");
    create("b.log");
    create("c.log");
    logs = {table({file("*.log")}, {"b.*", file("c.log")})};
    look();
    EXPECT_THAT(names(), ElementsAre(a));
}

TEST_F(LogFinderTest, PassesOverWhatIsNoFile) {
    const std::string a = create("a.log");
    std::filesystem::create_directory(file("directory.log"));
    ASSERT_EQ(mkfifo(file("pipe.log").c_str(), 0600), 0);
    ASSERT_EQ(symlink("/absent", file("dangling.log").c_str()), 0);
    create("old.log.gz");
    create("b\xff.log");
    logs = {table({file("*.log"), file("*.gz"), file("directory.log")})};
    look();
    EXPECT_THAT(names(), ElementsAre(a));
    EXPECT_EQ(reason(file("directory.log")), "It is a directory");
    EXPECT_EQ(reason(file("pipe.log")), "It is not a regular file");
    EXPECT_EQ(reason(file("dangling.log")), "It is a link that leads nowhere");
    EXPECT_EQ(reason(file("old.log.gz")), "It is compressed");
    EXPECT_EQ(reason(file("b\xff.log")), "Its name is not UTF-8");
}

TEST_F(LogFinderTest, SaysThatAPathDoesNotFitItsFormat) {
    logs = {table({file("*.log")})};
    logs[0].letter = 'U';
    logs[0].format = R"(A,"%s" , description = "${@} %s")";
    const std::string good = create("good.log");
    const std::string odd = create("100%d.log");
    const std::string deep = create(std::string(240, 'x') + ".log");
    look();
    EXPECT_THAT(names(), ElementsAre(good));
    EXPECT_THAT(reason(odd), HasSubstr("since '%' and '\"' mean something in it; leave out ${@}"));
    EXPECT_THAT(reason(deep),
                AllOf(testing::StartsWith("Its format has a directive of more than 255 characters "
                                          "once each ${@} is replaced by '/"),
                      HasSubstr("; write ${@} in fewer places, or give the log a shorter path")));
    logs[0].format = R"(A,"%s" , description)";
    look();
    EXPECT_EQ(names().size(), 3U);
}

TEST_F(LogFinderTest, AFileThatAppearsLaterIsANewcomerAndStaysOne) {
    create("a.log");
    logs = {table({file("*.log")})};
    look();
    create("b.log");
    look();
    EXPECT_FALSE(isNewcomer(file("a.log")));
    EXPECT_TRUE(isNewcomer(file("b.log")));
    look();
    EXPECT_TRUE(isNewcomer(file("b.log")));
}

TEST_F(LogFinderTest, FilesOfANewTableAreNoNewcomers) {
    create("a.log");
    create("b.txt");
    logs = {table({file("*.log")})};
    look();
    logs.push_back(table({file("*.txt")}));
    look();
    EXPECT_FALSE(isNewcomer(file("b.txt")));
}

TEST_F(LogFinderTest, FilesThatWereLeftOutUntilNowAreNoNewcomers) {
    create("a.log");
    create("b.log");
    create("own.log");
    logs = {table({file("*.log")}, {"b.*"})};
    ownFiles = {{file("own.log"), "the output of a sink"}};
    look();
    logs = {table({file("*.log")})};
    ownFiles = {};
    create("c.log");
    look();
    EXPECT_FALSE(isNewcomer(file("b.log")));
    EXPECT_FALSE(isNewcomer(file("own.log")));
    EXPECT_TRUE(isNewcomer(file("c.log")));
}

TEST_F(LogFinderTest, AFileThatWasALineOfTheLogConfigurationIsNoNewcomer) {
    logs = {table({file("*.log")})};
    look();
    const std::string a = create("a.log");
    const std::string b = create("b.log");
    look();
    EXPECT_TRUE(isNewcomer(a));
    FurtherLogs::noteLeftOut({a});
    look();
    FurtherLogs::noteLeftOut({}); // its line was removed
    look();
    EXPECT_FALSE(isNewcomer(a));
    EXPECT_TRUE(isNewcomer(b));
}

TEST_F(LogFinderTest, PassesOverOlderGenerations) {
    create("app.log");
    for (const char* const name :
         {"app.log.1", "app.log-20261122", "app.log.2026-11-22", "app-20261122.log", "app.log.2"}) {
        create(name);
    }
    create("app-2.log"); // a second instance, not a generation
    create("other.log.1");
    logs = {table({file("*")})};
    look();
    EXPECT_THAT(names(), ElementsAre(file("app-2.log"), file("app.log"), file("other.log.1")));
    EXPECT_EQ(reason(file("app.log.1")), "It is an older generation of " + file("app.log"));
    // Who names it means it.
    logs = {table({file("*"), file("app.log.1")})};
    look();
    EXPECT_THAT(names(), ElementsAre(file("app-2.log"), file("app.log"), file("other.log.1")));
    logs = {table({file("app.log.1"), file("*")})};
    look();
    EXPECT_THAT(names(), testing::Contains(file("app.log.1")));
}

TEST_F(LogFinderTest, AFileThatIsRenamedIsNotANewOne) {
    create("app.log");
    logs = {table({file("*.log")})};
    look();
    rename("app.log", "previous.log");
    create("app.log");
    look();
    EXPECT_THAT(names(), ElementsAre(file("app.log")));
    EXPECT_EQ(reason(file("previous.log")),
              "It was followed under another name before it was rotated");
    EXPECT_FALSE(isNewcomer(file("app.log")));
    now += 10min;
    look();
    EXPECT_THAT(names(), ElementsAre(file("app.log")));
}

TEST_F(LogFinderTest, SaysThatARenamedLogWithoutASuccessorIsNotRead) {
    create("a.log");
    logs = {table({file("*.log")})};
    look();
    rename("a.log", "b.log");
    look();
    EXPECT_THAT(names(), ElementsAre(file("a.log")));
    now += LogFinder::keptAbsent;
    for (int looks = 0; looks < 2; ++looks) {
        look();
        EXPECT_THAT(names(), IsEmpty());
        EXPECT_THAT(reason(file("b.log")),
                    HasSubstr("followed as " + file("a.log") + " until it was renamed"));
    }
    logs[0].paths.insert(logs[0].paths.begin(), file("b.log"));
    look();
    EXPECT_THAT(names(), ElementsAre(file("b.log")));
}

TEST_F(LogFinderTest, ARenamedLogIsFollowedUnderItsNewNameOnceItIsWrittenTo) {
    const auto book = std::make_shared<PositionBook>(PositionValues{}, true);
    PositionBook::makeCurrent(book);
    create("a.log");
    logs = {table({file("*.log")})};
    look();
    rename("a.log", "b.log");
    now += LogFinder::keptAbsent;
    look();
    book->setRenamed(found.renamed);
    {
        LogPositions former(file("a.log").c_str());
        LogPosition left;
        struct stat status;
        ASSERT_EQ(stat(file("b.log").c_str(), &status), 0);
        left.device = status.st_dev;
        left.inode = status.st_ino;
        left.offset = status.st_size;
        former.reached(left);
        former.left(left, true);
        directory.append("b.log", "late\n");
        look();
        EXPECT_THAT(names(), IsEmpty()); // still read as a part of a.log
        left.offset += 5;
        former.left(left, false);
    }
    look();
    EXPECT_THAT(names(), IsEmpty());
    EXPECT_THAT(reason(file("b.log")), HasSubstr("is followed again once it is written to"));
    directory.append("b.log", "on\n");
    for (int looks = 0; looks < 2; ++looks) {
        look();
        EXPECT_THAT(names(), ElementsAre(file("b.log")));
        EXPECT_THAT(found.renamed, IsEmpty());
        now += LogFinder::keptAbsent;
    }
    PositionBook::makeCurrent(PositionBook::unkept());
}

TEST_F(LogFinderTest, AFileThatIsGoneStaysForAWhile) {
    create("app.log");
    logs = {table({file("*.log")})};
    look();
    rename("app.log", "app.log.1");
    now += LogFinder::keptAbsent - 1s;
    look();
    EXPECT_THAT(names(), ElementsAre(file("app.log")));
    now += 1s;
    look();
    EXPECT_THAT(names(), IsEmpty());
    create("app.log");
    look();
    EXPECT_TRUE(isNewcomer(file("app.log")));
}

TEST_F(LogFinderTest, OlderGenerationsStayPassedOverWhenTheirLogIsGone) {
    create("app.log");
    create("app.log.2");
    logs = {table({file("*")})};
    look();
    rename("app.log", "app.log.1");
    look();
    now += LogFinder::keptAbsent;
    look();
    EXPECT_THAT(names(), IsEmpty());
    look();
    EXPECT_THAT(names(), IsEmpty());
    EXPECT_EQ(reason(file("app.log.1")), "It is an older generation of " + file("app.log"));
    rename("app.log.2", "app.log.3");
    rename("app.log.1", "app.log.2");
    look();
    EXPECT_THAT(names(), IsEmpty());
    const std::string young = create("app.log-20261122"); // from now on the application dates them
    look();
    EXPECT_THAT(names(), ElementsAre(young));
    create("app.log");
    look();
    EXPECT_THAT(names(), ElementsAre(file("app.log")));
}

TEST_F(LogFinderTest, AFollowedLogStaysWhenItsNameIsNoLongerAFiles) {
    create("app.log");
    create("named.log");
    logs = {table({file("*.log"), file("named.log")})};
    look();
    for (const char* const name : {"app.log", "named.log"}) {
        rename(name, std::string(name) + ".1");
        std::filesystem::create_directory(file(name));
    }
    now += LogFinder::keptAbsent + 1s;
    look();
    EXPECT_THAT(names(), ElementsAre(file("app.log"), file("named.log")));
    look();
    EXPECT_THAT(names(), ElementsAre(file("app.log"), file("named.log")));
}

TEST_F(LogFinderTest, OneFileOfTwoNamesIsFollowedOnce) {
    create("a.log");
    ASSERT_EQ(symlink(file("a.log").c_str(), file("current.log").c_str()), 0);
    logs = {table({file("*.log")})};
    look();
    EXPECT_THAT(names(), ElementsAre(file("a.log")));
    EXPECT_EQ(reason(file("current.log")), "It is the same file as " + file("a.log"));
}

TEST_F(LogFinderTest, TheFirstTableThatNamesAFileApplies) {
    create("a.log");
    logs = {table({file("*.log")}), table({file("a.*")})};
    logs[0].line = 7;
    look();
    EXPECT_THAT(names(), ElementsAre(file("a.log")));
    EXPECT_THAT(found.sources[1].files, IsEmpty());
    EXPECT_EQ(reason(file("a.log")), "The [[log]] at line 7 names it, too, and applies");
}

TEST_F(LogFinderTest, PassesOverWhatTheAgentWritesItself) {
    create("a.log");
    create("events.jsonl");
    ASSERT_EQ(symlink(file("events.jsonl").c_str(), file("events.log").c_str()), 0);
    ownFiles = {{file("events.jsonl"), "the output of a sink"}};
    logs = {table({file("*.log")})};
    look();
    EXPECT_THAT(names(), ElementsAre(file("a.log")));
    EXPECT_THAT(reason(file("events.log")), HasSubstr("the agent itself writes"));
}

TEST_F(LogFinderTest, TakesAtMostTenThousandFiles) {
    std::filesystem::create_directory(file("many"));
    const std::string first = create("many/00000.log");
    for (int number = 1; number <= 10'000; ++number) {
        std::filesystem::create_hard_link(first, file("many/" + std::to_string(number) + ".log"));
    }
    logs = {table({file("many/*.log")})};
    look();
    EXPECT_EQ(found.sources[0].problem,
              "More than 10000 paths match; name the files more narrowly");
    EXPECT_EQ(found.logs.size(), 1U);
    EXPECT_EQ(found.sources[0].passedOverCount, 9'999U);
    EXPECT_EQ(found.sources[0].passedOver.size(), FoundLogs::mostPassedOver);
}

TEST_F(LogFinderTest, FollowsAtMostTenThousandFilesAndKeepsThoseThatItHas) {
    for (const char* const name : {"one", "two"}) {
        std::filesystem::create_directory(file(name));
    }
    for (int number = 1; number <= 6'000; ++number) {
        create("two/" + std::to_string(number) + ".log");
    }
    logs = {table({file("one/*.log")}), table({file("two/*.log")})};
    look();
    EXPECT_EQ(found.logs.size(), 6'000U);
    for (int number = 1; number <= 6'000; ++number) {
        create("one/" + std::to_string(number) + ".log");
    }
    look();
    EXPECT_EQ(found.logs.size(), LogFinder::mostFiles);
    EXPECT_EQ(found.sources[0].files.size(), 4'000U);
    EXPECT_EQ(found.sources[0].problem,
              "More than 10000 files match; name the files more narrowly");
    EXPECT_EQ(found.sources[0].passedOverCount, 2'000U);
    EXPECT_EQ(found.sources[0].passedOver.front().reason, "There are too many files");
    EXPECT_EQ(found.sources[1].files.size(), 6'000U);
    EXPECT_EQ(found.sources[1].problem, "");
}

TEST_F(LogFinderTest, SaysThatADirectoryCannotBeRead) {
    create("a.log");
    logs = {table({file("*.log")}), table({file("loop/*.log")})};
    ASSERT_EQ(symlink(file("loop").c_str(), file("loop").c_str()), 0);
    look();
    EXPECT_THAT(names(), ElementsAre(file("a.log")));
    EXPECT_THAT(found.sources[1].problem, HasSubstr("cannot be read"));
}

} // namespace
