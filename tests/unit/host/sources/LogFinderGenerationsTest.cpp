// What LogFinder makes of files that are renamed or gone, and of older generations.

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

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

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

} // namespace
