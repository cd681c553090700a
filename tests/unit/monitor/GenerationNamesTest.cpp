#include "monitor/GenerationNames.h"

#include <gtest/gtest.h>

using namespace zrm;

namespace {

using Scheme = GenerationName::Scheme;

GenerationFile file(const std::string& name, ino_t inode, std::int64_t modified) {
    return {"/logs/" + name,       {1, inode}, modified, 1, *GenerationName::parse(name, "app.log"),
            isCompressedName(name)};
}

std::string names(const std::vector<GenerationFile>& files) {
    std::string text;
    for (const GenerationFile& one : files) {
        text += one.path.substr(6) + " ";
    }
    return text;
}

TEST(GenerationNames, TellsTheSchemesApart) {
    const auto scheme = [](std::string_view name) {
        return GenerationName::parse(name, "app.log")->scheme;
    };
    EXPECT_EQ(scheme("app.log.1"), Scheme::numbered);
    EXPECT_EQ(scheme("app.log.12.gz"), Scheme::numbered);
    EXPECT_EQ(scheme("app.1.log"), Scheme::numbered);
    EXPECT_EQ(scheme("app.log-20261119"), Scheme::dated);
    EXPECT_EQ(scheme("app-20261119.log.xz"), Scheme::dated);
    EXPECT_EQ(scheme("app.log.2026-11-19_10:30"), Scheme::dated);
    EXPECT_EQ(scheme("app.log.old"), Scheme::plain);
    EXPECT_EQ(scheme("app.log.bak"), Scheme::other);
    EXPECT_EQ(scheme("app.log_debug"), Scheme::other);
    EXPECT_EQ(scheme("app.log-2"), Scheme::other);
}

TEST(GenerationNames, LeaveOtherLogsAlone) {
    for (const char* const name : {"app-2.log", "app2.log", "other.log", "app.lo", "apply.log"}) {
        EXPECT_FALSE(GenerationName::parse(name, "app.log")) << name;
    }
}

TEST(GenerationNames, ANumberTooLongForOneIsNotAGeneration) {
    EXPECT_EQ(GenerationName::parse("app.log-1234567890123456789", "app.log")->scheme,
              Scheme::other);
}

TEST(YoungerThan, GoesByNumbersWhateverTheTimes) {
    const std::vector<GenerationFile> files = {file("app.log.1", 11, 1),
                                               file("app.log.2.gz", 12, 9),
                                               file("app.log.3", 13, 7), file("app.log.4", 14, 8)};
    EXPECT_EQ(names(youngerThan(files, {FileIdentity{1, 13}, 7})), "app.log.2.gz app.log.1 ");
}

TEST(YoungerThan, GoesByDates) {
    const std::vector<GenerationFile> files = {file("app.log-20261121", 11, 1),
                                               file("app.log-20261119", 12, 2),
                                               file("app.log-20261120", 13, 3)};
    EXPECT_EQ(names(youngerThan(files, {FileIdentity{1, 12}, 2})),
              "app.log-20261120 app.log-20261121 ");
}

TEST(YoungerThan, GoesByTimesIfTheNamesDoNotAgree) {
    const std::vector<GenerationFile> files = {
        file("app.log.1", 11, 30), file("app.log.old", 12, 20), file("app.log-20261120", 13, 10)};
    EXPECT_EQ(names(youngerThan(files, {FileIdentity{1, 13}, 10})), "app.log.old app.log.1 ");
}

TEST(YoungerThan, GoesByTimesIfTheReferenceHasNoName) {
    const std::vector<GenerationFile> files = {file("app.log.1", 11, 30), file("app.log.2", 12, 20),
                                               file("app.log.3", 13, 10)};
    EXPECT_EQ(names(youngerThan(files, {std::nullopt, 10})), "app.log.2 app.log.1 ");
}

TEST(YoungerThan, TakesNoFileThatIsNotKnownToBeAGeneration) {
    const std::vector<GenerationFile> files = {file("app.log.bak", 11, 30),
                                               file("app.log.1", 12, 20)};
    EXPECT_EQ(names(youngerThan(files, {std::nullopt, 10})), "app.log.1 ");
}

TEST(RotationDirectory, IsSeenFromTheLogsDirectoryUnlessItIsAbsolute) {
    EXPECT_EQ(rotationDirectory("/var/log/app.log", ""), "");
    EXPECT_EQ(rotationDirectory("/var/log/app.log", "old"), "/var/log/old/");
    EXPECT_EQ(rotationDirectory("/var/log/app.log", "/srv/old"), "/srv/old/");
}

TEST(NewestFirst, GoesByTheNamesIfTheyAgree) {
    EXPECT_EQ(names(newestFirst({file("app.log.10.gz", 11, 9), file("app.log.2", 12, 1),
                                 file("app.log.1", 13, 2), file("app.log.bak", 14, 3)})),
              "app.log.1 app.log.2 app.log.10.gz ");
    EXPECT_EQ(
        names(newestFirst({file("app.log-20261119", 11, 9), file("app.log-20261121.gz", 12, 1)})),
        "app.log-20261121.gz app.log-20261119 ");
    EXPECT_EQ(names(newestFirst({})), "");
}

TEST(NewestFirst, GoesByTimesIfTheyDoNot) {
    EXPECT_EQ(names(newestFirst({file("app.log.1", 11, 10), file("app.log-20261119", 12, 30),
                                 file("app.log.old", 13, 20)})),
              "app.log-20261119 app.log.old app.log.1 ");
}

TEST(NewestFirst, LeavesOutTheCompressedCopyOfAPlainFile) {
    EXPECT_EQ(names(newestFirst({file("app.log.1.gz", 11, 10), file("app.log.1", 12, 10),
                                 file("app.log.2.gz", 13, 9)})),
              "app.log.1 app.log.2.gz ");
}

} // namespace
