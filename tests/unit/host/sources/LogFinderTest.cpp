#include "LogFinderTest.h"

#include "host/events/PositionBook.h"

#include <gmock/gmock.h>

#include <chrono>
#include <filesystem>
#include <string>
#include <vector>

#include <sys/stat.h>
#include <unistd.h>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::AllOf;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

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
