#include "host/base/WatchedFile.h"

#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <filesystem>

using namespace zrm::host;

namespace {

class WatchedFileTest : public testing::Test {
protected:
    TemporaryDirectory directory;
    std::string path = directory.write("zrm.toml", "a");
    WatchedFile file{path};
};

TEST_F(WatchedFileTest, AnUntouchedFileHasNotChanged) {
    EXPECT_FALSE(file.hasChanged());
    EXPECT_FALSE(file.hasChanged());
}

TEST_F(WatchedFileTest, AChangeIsReportedOnceAndWhenTheFileIsComplete) {
    directory.append("zrm.toml", "b");
    EXPECT_FALSE(file.hasChanged());
    directory.append("zrm.toml", "c");
    EXPECT_FALSE(file.hasChanged());
    EXPECT_TRUE(file.hasChanged());
    EXPECT_FALSE(file.hasChanged());
}

TEST_F(WatchedFileTest, AReplacedFileHasChanged) {
    directory.write("new", "x");
    std::filesystem::last_write_time(directory.file("new"), std::filesystem::last_write_time(path));
    std::filesystem::rename(directory.file("new"), path);
    EXPECT_FALSE(file.hasChanged());
    EXPECT_TRUE(file.hasChanged());
}

TEST_F(WatchedFileTest, AMissingFileHasNotChangedUntilItIsBack) {
    std::filesystem::remove(path);
    EXPECT_FALSE(file.hasChanged());
    EXPECT_FALSE(file.hasChanged());
    directory.write("zrm.toml", "abc");
    EXPECT_FALSE(file.hasChanged());
    EXPECT_TRUE(file.hasChanged());
}

TEST(WatchedFile, WithoutAFileNothingChanges) {
    WatchedFile file("");
    EXPECT_FALSE(file.hasChanged());
    EXPECT_FALSE(file.hasChanged());
}

} // namespace
