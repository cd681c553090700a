#include "host/sources/JournalReading.h"

#include "TestJournal.h"
#include "base/EntryFields.h"
#include "framework/LogEntry.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <cstdlib>
#include <filesystem>
#include <string>
#include <thread>
#include <vector>

#include <sys/stat.h>
#include <unistd.h>

using namespace zrm;
using namespace zrm::host;
using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

namespace {

using Start = EntrySource::Reading::Start;

class JournalReadingTest : public testing::Test {
protected:
    JournalReadingTest() { config.directory = journal.directory.path(); }

    /// The messages that can be read now.
    static std::vector<std::string> messages(JournalReading& reading) {
        std::vector<std::string> messages;
        while (const char* const text = reading.next()) {
            messages.emplace_back(text);
        }
        return messages;
    }
    /// The next messages, which may take a moment to be seen.
    static std::vector<std::string> awaited(JournalReading& reading) {
        const auto limit = std::chrono::steady_clock::now() + std::chrono::seconds(60);
        std::vector<std::string> found = messages(reading);
        while (found.empty() && std::chrono::steady_clock::now() < limit) {
            reading.wait(std::chrono::milliseconds(50));
            found = messages(reading);
        }
        return found;
    }
    static std::vector<std::string> remarks(JournalReading& reading) {
        std::vector<std::string> texts;
        while (const auto remark = reading.takeRemark()) {
            texts.push_back((remark->isLoss ? "loss: " : "") + remark->text);
        }
        return texts;
    }
    std::vector<std::string> fromTheBeginning() {
        JournalReading reading(config);
        reading.startAt(Start::beginning);
        return messages(reading);
    }

    TestJournal journal;
    JournalConfig config;
};

TEST_F(JournalReadingTest, FillsTheColumns) {
    journal.add("Failed password for root", {{"SYSLOG_IDENTIFIER", "sshd"},
                                             {"_PID", "412"},
                                             {"PRIORITY", "4"},
                                             {"_SYSTEMD_UNIT", "ssh.service"}});
    journal.add("bare", {{"_COMM", "tool"}});
    journal.write();
    JournalReading reading(config);
    reading.startAt(Start::beginning);
    ASSERT_STREQ(reading.next(), "Failed password for root");
    EntryColumns columns;
    ASSERT_TRUE(reading.read(columns));
    EXPECT_TRUE(columns.hasTime);
    EXPECT_EQ(columns.time.seconds(), 1'763'000'000);
    EXPECT_EQ(columns.offset, 0);
    EXPECT_EQ(columns.system, "web1");
    EXPECT_EQ(columns.source, "sshd[412]");
    EXPECT_EQ(columns.type, "warning");
    EXPECT_EQ(columns.entryClass, "ssh");
    EXPECT_EQ(columns.description, "Failed password for root");
    ASSERT_STREQ(reading.next(), "bare");
    EntryColumns bare;
    ASSERT_TRUE(reading.read(bare));
    EXPECT_EQ(bare.source, "tool");
    EXPECT_EQ(bare.type, "");
    EXPECT_EQ(bare.entryClass, "");
    EXPECT_EQ(reading.next(), nullptr);
}

TEST_F(JournalReadingTest, WhatTheManagerSaysOfAUnitIsOfThatUnit) {
    journal.add("Failed",
                {{"_PID", "1"}, {"UNIT", "app.service"}, {"_SYSTEMD_UNIT", "init.scope"}});
    journal.write();
    JournalReading reading(config);
    reading.startAt(Start::beginning);
    ASSERT_NE(reading.next(), nullptr);
    EntryColumns columns;
    reading.read(columns);
    EXPECT_EQ(columns.entryClass, "app");
}

TEST_F(JournalReadingTest, GivesAllFieldsWhenAsked) {
    journal.add("text", {{"CODE_LINE", "17"}, {"_PID", "9"}, {"BINARY", std::string("a\0b", 3)}});
    journal.write();
    JournalReading reading(config);
    reading.startAt(Start::beginning);
    ASSERT_NE(reading.next(), nullptr);
    EntryFields fields;
    reading.readFields(fields);
    ASSERT_NE(fields.find("CODE_LINE"), nullptr);
    EXPECT_EQ(*fields.find("CODE_LINE"), "17");
    ASSERT_NE(fields.find("BINARY"), nullptr);
    EXPECT_EQ(*fields.find("BINARY"), std::string_view("a\0b", 3));
    ASSERT_NE(fields.find("MESSAGE"), nullptr);
    EXPECT_EQ(*fields.find("MESSAGE"), "text");
    EXPECT_EQ(fields.find("CODE"), nullptr);
}

TEST_F(JournalReadingTest, BoundsLongTexts) {
    const std::string tooLong(EntryKeep::longestText + 5, 'x');
    journal.add(tooLong, {{"BIG", std::string(1'000'000, 'y')}, {"SMALL", "1"}});
    journal.write();
    JournalReading reading(config);
    reading.startAt(Start::beginning);
    ASSERT_NE(reading.next(), nullptr);
    EXPECT_EQ(reading.text().size(), EntryKeep::longestText);
    EXPECT_TRUE(reading.isTextCut());
    EntryFields fields;
    reading.readFields(fields);
    EXPECT_NE(fields.find("SMALL"), nullptr);
    EXPECT_EQ(fields.find("BIG"), nullptr);
    EXPECT_GE(fields.leftOut(), 1U);
}

TEST_F(JournalReadingTest, BeginsAtTheEndAndReadsWhatComes) {
    journal.add("old");
    journal.write();
    JournalReading reading(config);
    reading.startAt(Start::end);
    EXPECT_THAT(messages(reading), IsEmpty());
    EXPECT_NE(reading.position(), "") << "a stop before the first entry must not lose it";
    journal.add("new");
    journal.write();
    EXPECT_THAT(awaited(reading), ElementsAre("new"));
}

TEST_F(JournalReadingTest, ResumesBehindAPosition) {
    for (const char* const text : {"1", "2", "3"}) {
        journal.add(text);
    }
    journal.write();
    std::string position;
    {
        JournalReading reading(config);
        reading.startAt(Start::beginning);
        reading.next();
        reading.next();
        position = reading.position();
    }
    JournalReading reading(config);
    reading.resumeAt(position);
    EXPECT_THAT(messages(reading), ElementsAre("3"));
    EXPECT_THAT(remarks(reading), IsEmpty());
}

TEST_F(JournalReadingTest, TakesBackAnEntry) {
    journal.add("1");
    journal.add("2");
    journal.write();
    JournalReading reading(config);
    reading.startAt(Start::beginning);
    reading.next();
    const std::string first = reading.position();
    reading.next();
    EXPECT_EQ(reading.takeBack(), first);
    JournalReading other(config);
    other.startAt(Start::beginning);
    other.next();
    const std::string before = other.takeBack();
    JournalReading again(config);
    again.resumeAt(before);
    EXPECT_THAT(messages(again), ElementsAre("1", "2")) << "nothing was judged";
}

TEST_F(JournalReadingTest, ReadsOnInTheNextFileAfterARotation) {
    journal.add("1");
    journal.write("a.journal");
    JournalReading reading(config);
    reading.startAt(Start::beginning);
    EXPECT_THAT(messages(reading), ElementsAre("1"));
    reading.wait(std::chrono::milliseconds(1));
    std::filesystem::rename(journal.path("a.journal"), journal.path("a@1.journal"));
    journal.add("2");
    journal.write("b.journal");
    EXPECT_THAT(awaited(reading), ElementsAre("2"));
    journal.add("3");
    journal.write("b.journal");
    EXPECT_THAT(awaited(reading), ElementsAre("3"));
    EXPECT_THAT(fromTheBeginning(), ElementsAre("1", "2", "3"));
}

TEST_F(JournalReadingTest, SaysWhatMayBeLostWithARemovedFile) {
    journal.add("1");
    journal.add("2");
    journal.write("a.journal");
    std::string position;
    {
        JournalReading reading(config);
        reading.startAt(Start::beginning);
        reading.next();
        position = reading.position();
    }
    journal.add("3");
    journal.write("b.journal");
    std::filesystem::remove(journal.path("a.journal"));
    JournalReading reading(config);
    reading.resumeAt(position);
    EXPECT_THAT(messages(reading), ElementsAre("3"));
    EXPECT_THAT(remarks(reading),
                ElementsAre("loss: Entries of the journal may have been lost: the entry at which "
                            "reading stopped, of 2025-11-13T02:13:20.000Z, has been removed, and "
                            "with it perhaps younger ones."));
}

TEST_F(JournalReadingTest, KeepsItsPlaceWhenTheFileOfItsPositionIsRemoved) {
    journal.add("1");
    journal.write("a.journal");
    JournalReading reading(config);
    reading.startAt(Start::beginning);
    EXPECT_THAT(messages(reading), ElementsAre("1"));
    const std::string position = reading.position();
    journal.add("2");
    journal.write("b.journal");
    EXPECT_THAT(awaited(reading), ElementsAre("2"));
    std::filesystem::remove(journal.path("a.journal"));
    reading.wait(std::chrono::milliseconds(50));
    journal.add("3");
    journal.write("c.journal");
    EXPECT_THAT(awaited(reading), ElementsAre("3"));
    std::filesystem::remove(journal.path("c.journal"));
    reading.wait(std::chrono::milliseconds(50));
    EXPECT_NE(reading.position(), position);
    EXPECT_NE(reading.position(), "");
    EXPECT_THAT(messages(reading), IsEmpty()) << "nothing is given twice";
}

TEST_F(JournalReadingTest, ReadsTheOtherFilesWhenOneIsDamaged) {
    journal.add("1");
    journal.write("a.journal");
    journal.directory.write("b.journal", std::string(4096, 'x').c_str());
    journal.directory.write("c.journal", "");
    JournalReading reading(config);
    reading.startAt(Start::beginning);
    EXPECT_THAT(messages(reading), ElementsAre("1"));
    EXPECT_EQ(reading.problem(), "");
    const std::vector<std::string> said = remarks(reading);
    ASSERT_EQ(said.size(), 1U);
    EXPECT_THAT(said[0], HasSubstr("2 of 3 files of the journal cannot be read, "));
    EXPECT_THAT(said[0], HasSubstr("b.journal for one: it is damaged. The others are read."));
}

TEST_F(JournalReadingTest, SurvivesAFileThatIsCutOffWhileItIsRead) {
    for (int number = 0; number < 2000; ++number) {
        journal.add("a " + std::to_string(number));
    }
    journal.write("a.journal");
    journal.add("last");
    journal.write("b.journal");
    JournalReading reading(config);
    reading.startAt(Start::beginning);
    ASSERT_STREQ(reading.next(), "a 0");
    std::filesystem::resize_file(journal.path("a.journal"), 4096);
    std::vector<std::string> found = messages(reading);
    ASSERT_FALSE(found.empty());
    EXPECT_EQ(found.back(), "last");
    EXPECT_LT(found.size(), 2000U);
    const std::vector<std::string> said = remarks(reading);
    ASSERT_FALSE(said.empty());
    EXPECT_THAT(said[0], HasSubstr("loss: A file of the journal was cut off"));
}

TEST_F(JournalReadingTest, SaysWhenAllFilesAreDamaged) {
    journal.directory.write("b.journal", std::string(4096, 'x').c_str());
    JournalReading reading(config);
    reading.startAt(Start::beginning);
    EXPECT_THAT(messages(reading), IsEmpty());
    EXPECT_EQ(reading.problem(),
              "the journal cannot be read: " + journal.path("b.journal") + ": it is damaged");
}

TEST_F(JournalReadingTest, WaitsForAJournalThatIsNotThere) {
    JournalReading reading(config);
    reading.startAt(Start::end);
    EXPECT_THAT(messages(reading), IsEmpty());
    EXPECT_EQ(reading.problem(), "there is no journal");
    EXPECT_EQ(reading.position(), "");
    journal.add("1");
    journal.write();
    EXPECT_THAT(awaited(reading), ElementsAre("1")) << "all of a journal that appears later is new";
    EXPECT_EQ(reading.problem(), "");
}

TEST_F(JournalReadingTest, ReadsFromADirectoryThatIsReplaced) {
    journal.add("1");
    journal.write();
    const std::string directory = journal.directory.file("below");
    std::filesystem::create_directory(directory);
    std::filesystem::rename(journal.path("a.journal"), directory + "/a.journal");
    config.directory = directory;
    JournalReading reading(config);
    reading.startAt(Start::beginning);
    EXPECT_THAT(messages(reading), ElementsAre("1"));
    std::filesystem::rename(directory, directory + ".old");
    std::filesystem::create_directory(directory);
    journal.add("2");
    journal.write("below/b.journal");
    EXPECT_THAT(awaited(reading), ElementsAre("2"));
}

TEST_F(JournalReadingTest, PassesOverWhatThisProgramHasWritten) {
    const std::string self = std::filesystem::read_symlink("/proc/self/exe").string();
    journal.add("1");
    journal.add("mine", {{"_EXE", self}});
    journal.add("not mine", {{"SYSLOG_IDENTIFIER", "zrmagent"}, {"_EXE", "/bin/other"}});
    setenv("INVOCATION_ID", "0c4f2d8a11e84c1f9c5d2b7a6e3f1029", 1);
    journal.add("of my service", {{"_SYSTEMD_INVOCATION_ID", "0c4f2d8a11e84c1f9c5d2b7a6e3f1029"}});
    journal.write();
    EXPECT_THAT(fromTheBeginning(), ElementsAre("1", "not mine"));
    unsetenv("INVOCATION_ID");
}

TEST_F(JournalReadingTest, ReadsTheUnitsThatAreNamed) {
    journal.add("ssh", {{"_SYSTEMD_UNIT", "ssh.service"}});
    journal.add("nginx", {{"_SYSTEMD_UNIT", "nginx.service"}});
    journal.add("nginx 2", {{"_SYSTEMD_UNIT", "nginx-b.service"}});
    journal.add("of ssh", {{"_PID", "1"}, {"UNIT", "ssh.service"}});
    journal.add("claimed", {{"_PID", "7"}, {"UNIT", "ssh.service"}});
    journal.write();
    config.units = {"ssh.service"};
    EXPECT_THAT(fromTheBeginning(), ElementsAre("ssh", "of ssh"));
    config.units = {"nginx*", "ssh.service"};
    EXPECT_THAT(fromTheBeginning(), ElementsAre("ssh", "nginx", "nginx 2", "of ssh"));
}

TEST_F(JournalReadingTest, ReadsIdentifiersAndPrioritiesThatAreNamed) {
    journal.add("a", {{"SYSLOG_IDENTIFIER", "a"}, {"PRIORITY", "3"}});
    journal.add("b", {{"SYSLOG_IDENTIFIER", "b"}, {"PRIORITY", "4"}});
    journal.add("b debug", {{"SYSLOG_IDENTIFIER", "b"}, {"PRIORITY", "7"}});
    journal.add("c", {{"SYSLOG_IDENTIFIER", "c"}, {"PRIORITY", "0"}});
    journal.write();
    config.priority = 4;
    EXPECT_THAT(fromTheBeginning(), ElementsAre("a", "b", "c"));
    config.identifiers = {"b", "c"};
    EXPECT_THAT(fromTheBeginning(), ElementsAre("b", "c"));
    config.isCurrentBoot = true;
    EXPECT_THAT(fromTheBeginning(), IsEmpty());
}

TEST_F(JournalReadingTest, RecallsThePeriodBeforeAPosition) {
    for (int number = 0; number < 10; ++number) {
        journal.add(std::to_string(number));
    }
    journal.write();
    JournalReading reading(config);
    reading.startAt(Start::beginning);
    for (int number = 0; number < 7; ++number) {
        reading.next();
    }
    JournalReading recalled(config);
    recalled.recall(reading.position(), std::chrono::seconds(3));
    EXPECT_THAT(messages(recalled), ElementsAre("3", "4", "5", "6"));
}

TEST_F(JournalReadingTest, DoesNotWaitBetweenUnwantedEntries) {
    constexpr int unwanted = 25'000;
    for (int number = 0; number < unwanted; ++number) {
        journal.add("noise", {{"_SYSTEMD_UNIT", "busy.service"}});
    }
    journal.add("wanted", {{"_SYSTEMD_UNIT", "rare.service"}});
    journal.write();
    config.units = {"rare*"};
    JournalReading reading(config);
    reading.startAt(Start::beginning);
    char* entry = reading.next();
    for (int looks = 0; entry == nullptr && looks < 10; ++looks) {
        reading.wait(std::chrono::hours(1)); // the test would not end
        entry = reading.next();
    }
    EXPECT_STREQ(entry, "wanted");
}

} // namespace
