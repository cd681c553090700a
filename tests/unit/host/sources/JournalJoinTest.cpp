#include "host/sources/JournalJoin.h"

#include "TestJournal.h"
#include "base/EntryFields.h"
#include "host/formats/FormatDescription.h"
#include "host/sources/JournalJoinBack.h"
#include "host/sources/JournalReading.h"
#include "host/sources/JournalSource.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <limits>
#include <memory>
#include <random>
#include <string>
#include <vector>

using namespace zrm;
using namespace zrm::host;
using testing::ElementsAre;
using testing::IsEmpty;

namespace {

using Start = EntrySource::Reading::Start;
using namespace std::chrono_literals;

std::shared_ptr<const LineJoin> indented(LineJoin::Limits limits = {}) {
    FormatDescription description;
    description.lines.indented = true;
    description.lines.limits = limits;
    return *makeLineJoin(description);
}

class JournalJoinTest : public testing::Test {
protected:
    JournalJoinTest() { config.directory = journal.directory.path(); }

    void add(const std::string& process, const std::string& message) {
        journal.add(message, {{"_PID", process}, {"_SYSTEMD_UNIT", "shop.service"}});
    }
    /// Entries of another program that are so late that nothing waits any more.
    void addLater() {
        for (int count = 0; count < 100; ++count) {
            add("99", "later");
        }
        journal.write();
    }
    /// What is read now, without the later entries.
    static std::vector<std::string> read(JournalReading& reading) {
        std::vector<std::string> texts;
        while (const char* const text = reading.next()) {
            if (std::string_view(text) != "later") {
                texts.emplace_back(text);
            }
        }
        return texts;
    }
    std::vector<std::string> all() {
        JournalReading reading(config, nullptr, join);
        reading.startAt(Start::beginning);
        return read(reading);
    }
    /// Newest first.
    std::vector<std::string> backwards() const {
        const std::unique_ptr<EntrySource::Past> past = JournalSource(config, {}, {join}).past();
        EXPECT_TRUE(past->begin(std::numeric_limits<std::int64_t>::max()));
        std::vector<std::string> texts;
        while (const char* const text = past->previous()) {
            if (std::string_view(text) != "later") {
                texts.emplace_back(text);
            }
        }
        return texts;
    }

    TestJournal journal;
    JournalConfig config;
    std::shared_ptr<const LineJoin> join = indented({1000, LineJoin::mostBytes, 60s});
};

TEST_F(JournalJoinTest, LinesOfOneWriterAreAnEntryWhateverIsBetweenThem) {
    add("1", "Exception");
    add("2", "another");
    add("1", " at a");
    add("2", " of two lines");
    add("3", "single");
    add("1", " at b");
    add("1", "next");
    addLater();
    EXPECT_THAT(all(),
                ElementsAre("Exception\n at a\n at b", "another\n of two lines", "single", "next"));
    EXPECT_THAT(backwards(),
                ElementsAre("next", "single", "another\n of two lines", "Exception\n at a\n at b"));
}

TEST_F(JournalJoinTest, AnEntryHasTheColumnsAndFieldsOfItsFirstLine) {
    journal.add("Exception", {{"_PID", "1"}, {"PRIORITY", "3"}, {"NUMBER", "1"}});
    journal.add(" at a", {{"_PID", "1"}, {"PRIORITY", "6"}, {"NUMBER", "2"}});
    addLater();
    JournalReading reading(config, nullptr, join);
    reading.startAt(Start::beginning);
    ASSERT_STREQ(reading.next(), "Exception\n at a");
    EXPECT_EQ(reading.text(), "Exception\n at a");
    EntryColumns columns;
    ASSERT_TRUE(reading.read(columns));
    EXPECT_EQ(columns.type, "err");
    EXPECT_EQ(columns.system, "web1");
    EXPECT_EQ(columns.description, "Exception\n at a");
    EXPECT_EQ(columns.time.second, 20);
    EntryFields fields;
    reading.readFields(fields);
    EXPECT_EQ(*fields.find("NUMBER"), "1");
    EXPECT_EQ(*fields.find("MESSAGE"), "Exception\n at a");
}

TEST_F(JournalJoinTest, AnEntryEndsAtItsLimits) {
    join = indented({3, LineJoin::mostBytes, 60s});
    for (const char* const text : {"a", " b", " c", " d", " e"}) {
        add("1", text);
    }
    addLater();
    EXPECT_THAT(all(), ElementsAre("a\n b\n c", " d\n e"));
    EXPECT_THAT(backwards(), ElementsAre(" d\n e", "a\n b\n c"));
    join = indented({1000, 8, 60s});
    EXPECT_THAT(all(), ElementsAre("a\n b\n c", " d\n e"));
    EXPECT_THAT(backwards(), ElementsAre(" d\n e", "a\n b\n c"));
}

TEST_F(JournalJoinTest, ALineThatIsLateBeginsAnEntry) {
    join = indented({1000, LineJoin::mostBytes, 2s});
    add("1", "a");
    add("2", "x");
    add("1", " two seconds later");
    add("2", "y");
    add("2", "z");
    add("1", " three seconds later");
    addLater();
    EXPECT_THAT(all(), ElementsAre("a\n two seconds later", "x", "y", "z", " three seconds later"));
    EXPECT_THAT(backwards(),
                ElementsAre(" three seconds later", "z", "y", "x", "a\n two seconds later"));
}

TEST_F(JournalJoinTest, TheLastEntryWaitsForFurtherLines) {
    join = indented({1000, LineJoin::mostBytes, 1s});
    add("1", "a");
    journal.write();
    JournalReading reading(config, nullptr, join);
    reading.startAt(Start::beginning);
    const auto begin = std::chrono::steady_clock::now();
    EXPECT_THAT(read(reading), IsEmpty());
    add("1", " b");
    journal.write();
    std::vector<std::string> texts;
    while (texts.empty() && std::chrono::steady_clock::now() < begin + 60s) {
        reading.wait(1000ms);
        texts = read(reading);
    }
    EXPECT_THAT(texts, ElementsAre("a\n b"));
    EXPECT_GE(std::chrono::steady_clock::now() - begin, 1s);
}

TEST_F(JournalJoinTest, AnEntryDoesNotWaitForMoreLinesThanFit) {
    join = indented({1000, LineJoin::mostBytes, 10h});
    add("1", "a");
    for (std::size_t count = 0; count <= JournalJoin::mostLines; ++count) {
        add("2", "x");
    }
    add("1", " late");
    addLater();
    const std::vector<std::string> texts = all();
    ASSERT_EQ(texts.size(), JournalJoin::mostLines + 1); // the last "x" waits for further lines
    EXPECT_EQ(texts.front(), "a");
    const std::vector<std::string> older = backwards();
    ASSERT_EQ(older.size(), JournalJoin::mostLines + 3);
    EXPECT_EQ(older.front(), " late");
    EXPECT_EQ(older.back(), "a");
}

TEST_F(JournalJoinTest, ALineThatIsLongerThanATextIsAnEntryOfItsOwn) {
    add("1", "a");
    add("1", ' ' + std::string(LineJoin::mostBytes, 'x'));
    add("1", " b");
    addLater();
    const std::vector<std::string> texts = all();
    ASSERT_EQ(texts.size(), 3U);
    EXPECT_EQ(texts[1].size(), LineJoin::mostBytes);
    EXPECT_EQ(texts[2], " b");
    EXPECT_EQ(backwards().size(), 3U);
}

TEST_F(JournalJoinTest, WhatWaitsAtTheEndIsReadAgain) {
    add("1", "done");
    add("2", "a");
    add("1", "next");
    journal.write();
    std::string position;
    {
        JournalReading reading(config, nullptr, join);
        reading.startAt(Start::beginning);
        EXPECT_THAT(read(reading), ElementsAre("done"));
        position = reading.position();
    }
    add("2", " b");
    addLater();
    JournalReading reading(config, nullptr, join);
    reading.resumeAt(position);
    EXPECT_THAT(read(reading), ElementsAre("a\n b", "next"));
    EXPECT_EQ(reading.takeRemark(), std::nullopt);
}

TEST_F(JournalJoinTest, ThePastTurnsRoundInTheMiddleOfEntries) {
    add("1", "first");
    add("2", "second");
    add("1", " of first");
    add("2", " of second");
    add("3", "third");
    add("2", " of second too");
    addLater();
    const std::unique_ptr<EntrySource::Past> past = JournalSource(config, {}, {join}).past();
    ASSERT_TRUE(past->begin(std::numeric_limits<std::int64_t>::max()));
    const char* text = past->previous();
    while (text != nullptr && std::string_view(text).substr(0, 6) != "second") {
        text = past->previous();
    }
    EXPECT_STREQ(text, "second\n of second\n of second too");
    ASSERT_TRUE(past->turn());
    EXPECT_STREQ(past->next(), "second\n of second\n of second too");
    EXPECT_STREQ(past->next(), "third");
    EXPECT_STREQ(past->next(), "later");
    EXPECT_EQ(past->problem(), "");
}

TEST_F(JournalJoinTest, ADefinitionSaysWhatIsJoined) {
    EXPECT_NE(JournalSource(config).definition(), JournalSource(config, {}, {join}).definition());
}

/// Entries as they should be: each with the number of its first line, in their order.
std::vector<std::string> expected(const std::vector<std::pair<int, std::string>>& lines) {
    std::vector<std::string> entries;
    std::vector<int> last(3, -1); ///< entry of each writer
    for (const auto& [writer, text] : lines) {
        int& entry = last[static_cast<std::size_t>(writer)];
        if (text.front() == ' ' && entry >= 0) {
            entries[static_cast<std::size_t>(entry)] += '\n' + text;
        } else {
            entry = static_cast<int>(entries.size());
            entries.push_back(text);
        }
    }
    return entries;
}

TEST_F(JournalJoinTest, EachLineIsInOneEntryWhereverReadingStopsAndGoesOn) {
    const unsigned seed = std::random_device()();
    SCOPED_TRACE("seed " + std::to_string(seed));
    std::minstd_rand chance(seed);
    std::vector<std::pair<int, std::string>> lines;
    for (int number = 0; number < 300; ++number) {
        const int writer = static_cast<int>(chance() % 3);
        lines.emplace_back(writer, (chance() % 3 == 0 ? "" : " ") + std::to_string(number));
        add(std::to_string(writer), lines.back().second);
    }
    addLater();
    std::vector<std::string> wanted = expected(lines);
    for (int round = 0; round < 20; ++round) {
        std::vector<std::string> given;
        auto reading = std::make_unique<JournalReading>(config, nullptr, join);
        reading->startAt(Start::beginning);
        while (const char* const text = reading->next()) {
            if (std::string_view(text) == "later") {
                continue;
            }
            const bool isTakenBack = chance() % 8 == 0;
            if (!isTakenBack) {
                given.emplace_back(text);
            }
            if (isTakenBack || chance() % 4 == 0) {
                const std::string position =
                    isTakenBack ? reading->takeBack() : reading->position();
                reading = std::make_unique<JournalReading>(config, nullptr, join);
                reading->resumeAt(position);
                EXPECT_EQ(reading->takeRemark(), std::nullopt);
            }
        }
        ASSERT_EQ(given, wanted);
    }
    std::reverse(wanted.begin(), wanted.end());
    EXPECT_EQ(backwards(), wanted);
}

} // namespace
