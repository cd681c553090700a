#include "host/sources/LogList.h"

#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <string>
#include <thread>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

class LogListTest : public testing::Test {
protected:
    ~LogListTest() override { FurtherLogs::publish(nullptr); }

    static LogConfig table(const std::string& path) {
        LogConfig log;
        log.paths = {path};
        return log;
    }
    bool waitForChanges(int count) const {
        const auto limit = std::chrono::steady_clock::now() + std::chrono::seconds(30);
        while (changes < count && std::chrono::steady_clock::now() < limit) {
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
        return changes >= count;
    }

    TemporaryDirectory directory;
    std::atomic<int> changes{0};
    LogList list{[this] { ++changes; }};
};

TEST_F(LogListTest, WithoutTablesNothingIsPublished) {
    list.begin({}, {});
    EXPECT_EQ(FurtherLogs::published(), nullptr);
    EXPECT_TRUE(LogList::found()->sources.empty());
}

TEST_F(LogListTest, PublishesWhatTheTablesNameAtTheStart) {
    const std::string a = directory.write("a.log", "");
    list.begin({table(directory.file("*.log"))}, {});
    ASSERT_NE(FurtherLogs::published(), nullptr);
    ASSERT_EQ(FurtherLogs::published()->size(), 1U);
    EXPECT_EQ(FurtherLogs::published()->front().name, a);
    EXPECT_EQ(LogList::found()->sources.size(), 1U);
    EXPECT_EQ(changes, 0); // the log manager, which does not exist yet, takes it by itself
}

TEST_F(LogListTest, ANewFileChangesTheList) {
    directory.write("a.log", "");
    list.begin({table(directory.file("*.log"))}, {});
    const auto before = FurtherLogs::published();
    ASSERT_TRUE(list.start());
    list.apply({table(directory.file("*.log"))}, {}); // looks at once; nothing has changed
    directory.write("b.log", "");
    ASSERT_TRUE(waitForChanges(1));
    EXPECT_EQ(FurtherLogs::published()->size(), 2U);
    EXPECT_EQ(before->size(), 1U);
}

TEST_F(LogListTest, LooksAtOnceWhenTheLogManagerRefreshes) {
    LogList patient([this] { ++changes; }, std::chrono::hours(1));
    patient.begin({table(directory.file("*.log"))}, {});
    ASSERT_TRUE(patient.start());
    directory.write("a.log", "");
    FurtherLogs::noteRefresh();
    ASSERT_TRUE(waitForChanges(1));
    EXPECT_EQ(FurtherLogs::published()->size(), 1U);
}

TEST_F(LogListTest, TakesTablesThatAreAddedAndRemoved) {
    list.begin({}, {});
    ASSERT_TRUE(list.start());
    list.apply({table(directory.file("a.log"))}, {});
    ASSERT_TRUE(waitForChanges(1));
    EXPECT_EQ(FurtherLogs::published()->size(), 1U);
    list.apply({}, {});
    ASSERT_TRUE(waitForChanges(2));
    ASSERT_NE(FurtherLogs::published(), nullptr);
    EXPECT_TRUE(FurtherLogs::published()->empty());
}

} // namespace
