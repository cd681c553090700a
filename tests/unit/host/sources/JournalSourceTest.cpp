#include "host/sources/JournalSource.h"

#include "TestJournal.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>

using namespace zrm;
using namespace zrm::host;

namespace {

class JournalSourceTest : public testing::Test {
protected:
    JournalSourceTest() { config.directory = journal.directory.path(); }

    TestJournal journal;
    JournalConfig config;
};

TEST_F(JournalSourceTest, ReadsBackwardsFromATime) {
    for (int number = 0; number < 5; ++number) {
        journal.add(std::to_string(number));
    }
    journal.write();
    const JournalSource source(config);
    const std::unique_ptr<EntrySource::Past> past = source.past();
    ASSERT_TRUE(past->begin(TestJournal::firstTime + 3'000'000));
    for (const char* const expected : {"3", "2", "1", "0"}) {
        EXPECT_STREQ(past->previous(), expected);
    }
    EXPECT_EQ(past->previous(), nullptr);
    EXPECT_EQ(past->problem(), "");
}

TEST_F(JournalSourceTest, HasADefinitionForEachConfiguration) {
    const std::string one = JournalSource(config).definition();
    EXPECT_EQ(JournalSource(config).definition(), one);
    config.priority = 3;
    EXPECT_NE(JournalSource(config).definition(), one);
}

} // namespace
