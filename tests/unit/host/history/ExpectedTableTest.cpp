#include "host/history/ExpectedTable.h"

#include "host/history/HistoryFile.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

using namespace zrm::host;

namespace {

using testing::IsEmpty;
using testing::UnorderedElementsAre;

ExpectedGroup group(const std::string& key, std::int64_t seen) {
    return {"backup", key, -17, seen, 1'800'000'000, "/log", "web1:ZRM"};
}

TEST(ExpectedTable, KeepsGroupsAndTheWatchedTime) {
    const TemporaryDirectory directory;
    HistoryFile file(directory.file("history.db"));
    EXPECT_TRUE(file.expected().isEmpty());
    const std::string key("\0\1a", 3); // as GroupKey makes them
    file.keepExpected({5'000, {}, {group(key, 4'000), group("b", -1)}});
    EXPECT_EQ(file.expected().watched, 5'000);
    EXPECT_THAT(file.expected().groups, UnorderedElementsAre(group(key, 4'000), group("b", -1)));
    file.keepExpected({0, {{"backup", key}, {"other", "b"}}, {group("b", 6'000)}});
    EXPECT_EQ(file.expected().watched, 5'000);
    EXPECT_THAT(file.expected().groups, UnorderedElementsAre(group("b", 6'000)));
}

} // namespace
