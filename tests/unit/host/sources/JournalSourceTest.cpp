#include "host/sources/JournalSource.h"

#include "TestJournal.h"
#include "base/EntryFields.h"
#include "framework/LogEntry.h"
#include "host/formats/FormatDescription.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>
#include <string_view>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

class JournalSourceTest : public testing::Test {
protected:
    JournalSourceTest() { config.directory = journal.directory.path(); }

    /// The messages on the way forward, after at most `most` steps back from a second.
    std::string messagesAfterTurn(std::uint64_t second, int most) {
        const std::unique_ptr<EntrySource::Past> past = JournalSource(config).past();
        EXPECT_TRUE(past->begin(static_cast<std::int64_t>(TestJournal::firstTime) +
                                static_cast<std::int64_t>(second * 1'000'000)));
        int steps = 0;
        while (steps <= most && past->previous() != nullptr) {
            ++steps;
        }
        std::string messages;
        EXPECT_TRUE(steps == 0 || past->turn());
        while (const char* const text = steps > 0 ? past->next() : nullptr) {
            messages += std::string(text) + ' ';
        }
        EXPECT_EQ(past->problem(), "");
        return messages;
    }

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

TEST_F(JournalSourceTest, TurnsRoundAndGivesTheSameEntriesForward) {
    for (int number = 0; number < 6; ++number) {
        journal.add(std::to_string(number), {{"SYSLOG_IDENTIFIER", number == 1 ? "other" : "app"}});
    }
    journal.write();
    config.units = {"*"}; // compared here, not by the library: none has a unit
    EXPECT_EQ(messagesAfterTurn(5, 9), "");
    config.units.clear();
    EXPECT_EQ(messagesAfterTurn(4, 2), "2 3 4 5 ");
    EXPECT_EQ(messagesAfterTurn(4, 9), "0 1 2 3 4 5 ");
    config.identifiers = {"app"};
    EXPECT_EQ(messagesAfterTurn(3, 9), "0 2 3 4 5 ");
}

TEST_F(JournalSourceTest, PassesOverAnyNumberOfUnwantedEntries) {
    constexpr int unwanted = 25'000;
    journal.add("first", {{"_SYSTEMD_UNIT", "rare.service"}});
    for (int number = 0; number < unwanted; ++number) {
        journal.add("noise", {{"_SYSTEMD_UNIT", "busy.service"}});
    }
    journal.add("last", {{"_SYSTEMD_UNIT", "rare.service"}});
    journal.write();
    config.units = {"rare*"};
    EXPECT_EQ(messagesAfterTurn(unwanted + 1, 9), "first last ");
}

TEST_F(JournalSourceTest, HostileMessagesStayAsTheyAre) {
    std::string deep;
    for (int level = 0; level < 10'000; ++level) {
        deep += R"({"a":)";
    }
    const std::vector<std::string> messages = {
        "\xFF\xFE{}",
        std::string("{\"msg\":\"a\0b\"}", 13),
        deep,
        std::string(EntryKeep::longestText + 100, '['),
        R"({"msg":"\ud800"})",
        R"({"msg":"cut)",
        "",
        "\n{\n",
    };
    for (const std::string& message : messages) {
        journal.add(message, {{"SYSLOG_IDENTIFIER", "app"}});
    }
    journal.add(R"({"msg":"good"})");
    journal.write();
    FormatDescription description;
    description.type = "json";
    const JournalSource source(config, {*MessageFormat::make(description)});
    const std::unique_ptr<EntrySource::Past> past = source.past();
    ASSERT_TRUE(past->begin(TestJournal::firstTime + 3'600'000'000));
    EntryColumns good;
    ASSERT_NE(past->previous(), nullptr);
    ASSERT_TRUE(past->read(good));
    EXPECT_EQ(good.description, "good");
    for (std::size_t index = messages.size(); index-- > 0;) {
        ASSERT_NE(past->previous(), nullptr);
        EntryColumns columns;
        ASSERT_TRUE(past->read(columns));
        EXPECT_EQ(columns.description, messages[index].substr(0, EntryKeep::longestText)) << index;
        EXPECT_EQ(columns.source, "app") << index;
        EntryFields fields;
        past->readFields(fields);
        const std::string_view* const identifier = fields.find("SYSLOG_IDENTIFIER");
        ASSERT_NE(identifier, nullptr);
        EXPECT_EQ(*identifier, "app");
    }
}

TEST_F(JournalSourceTest, HasADefinitionForEachConfiguration) {
    const std::string one = JournalSource(config).definition();
    EXPECT_EQ(JournalSource(config).definition(), one);
    FormatDescription description;
    description.type = "journal";
    EXPECT_NE(JournalSource(config, {*MessageFormat::make(description)}).definition(), one);
    config.priority = 3;
    EXPECT_NE(JournalSource(config).definition(), one);
}

} // namespace
