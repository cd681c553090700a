#include "FileFollowerTest.h"
#include "TestJoin.h"

#include <gmock/gmock.h>

#include <string>
#include <vector>

// Entries of several lines in a followed log. The last ones in the file wait for further lines.

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class FileFollowerJoinTest : public FileFollowerTest {
protected:
    FileFollowerJoinTest() {
        m_options.join = TestJoin::indented({.wait = seconds(5)});
        begin();
        EXPECT_THAT(entries(), IsEmpty());
    }

    /// The texts of the entries that a look after some time delivers.
    std::vector<std::string> entries(seconds passed = seconds(1)) {
        m_now += passed;
        std::vector<std::string> texts;
        if (m_follower->look({m_now, 0})) {
            while (m_follower->next() != nullptr) {
                texts.emplace_back(m_follower->text());
            }
        }
        m_follower->noteProgress();
        return texts;
    }

    std::int64_t offset() const { return m_follower->position()->offset; }
};

TEST_F(FileFollowerJoinTest, TheNextEntryEndsAnEntry) {
    append("one\n a\n");
    EXPECT_THAT(entries(), IsEmpty());
    EXPECT_EQ(offset(), 4) << "before the entry that waits";
    append(" b\ntwo\n");
    EXPECT_THAT(entries(), ElementsAre("one\n a\n b"));
    EXPECT_EQ(offset(), 14);
}

TEST_F(FileFollowerJoinTest, ALineThatComesTooLateIsAnEntryOfItsOwn) {
    append("one\n a\n");
    EXPECT_THAT(entries(), IsEmpty());
    EXPECT_THAT(entries(seconds(3)), IsEmpty());
    EXPECT_THAT(entries(seconds(3)), ElementsAre("one\n a"));
    EXPECT_EQ(offset(), 11);
    append(" b\n c\n");
    EXPECT_THAT(entries(), IsEmpty());
    EXPECT_THAT(entries(seconds(6)), ElementsAre(" b\n c"));
    EXPECT_THAT(entries(seconds(6)), IsEmpty());
    EXPECT_EQ(offset(), 17);
}

TEST_F(FileFollowerJoinTest, TheWaitBeginsWithTheLastWholeLine) {
    append("one\n");
    EXPECT_THAT(entries(), IsEmpty());
    append(" a\n");
    EXPECT_THAT(entries(seconds(4)), IsEmpty());
    append(" half");
    EXPECT_THAT(entries(seconds(4)), IsEmpty());
    EXPECT_THAT(entries(seconds(3)), ElementsAre("one\n a"));
    append(" line\ntwo\n");
    EXPECT_THAT(entries(), ElementsAre(" half line"));
}

TEST_F(FileFollowerJoinTest, WithoutAWaitEverythingIsGivenAtOnce) {
    append("one\n a\n");
    EXPECT_THAT(entries(), IsEmpty());
    m_follower->waitNoLonger();
    EXPECT_THAT(entries(), ElementsAre("one\n a"));
}

TEST_F(FileFollowerJoinTest, AnEntryThatWaitsIsReadAfterARestart) {
    append("one\n a\n");
    EXPECT_THAT(entries(), IsEmpty());
    restart();
    append(" b\n");
    EXPECT_THAT(entries(), IsEmpty());
    EXPECT_THAT(entries(seconds(6)), ElementsAre("one\n a\n b"));
    restart();
    EXPECT_THAT(entries(), IsEmpty());
    EXPECT_THAT(entries(seconds(6)), IsEmpty());
}

TEST_F(FileFollowerJoinTest, TheEndOfARotatedFileEndsItsLastEntry) {
    append("one\n a\n");
    EXPECT_THAT(entries(), IsEmpty());
    rename("app.log", "app.log.1");
    m_directory.append("app.log.1", " b\n");
    append("two\n c\nthree\n");
    EXPECT_THAT(entries(), IsEmpty()) << "the rotated file may still be written to";
    EXPECT_THAT(entries(seconds(3)), ElementsAre("one\n a\n b", "two\n c"));
}

TEST_F(FileFollowerJoinTest, AnUnfinishedLineAtTheEndOfARotatedFile) {
    append("one\n a\n half");
    rename("app.log", "app.log.1");
    append("two\n");
    EXPECT_THAT(entries(), IsEmpty());
    EXPECT_THAT(entries(seconds(3)), ElementsAre("one\n a\n half"));
    append("three\n a\nfour");
    EXPECT_THAT(entries(), ElementsAre("two"));
    rename("app.log.1", "app.log.2");
    rename("app.log", "app.log.1");
    append("five\n");
    EXPECT_THAT(entries(), IsEmpty());
    EXPECT_THAT(entries(seconds(3)), ElementsAre("three\n a", "four"));
}

TEST_F(FileFollowerJoinTest, AnEntryThatATruncationRemovesIsGivenFromMemory) {
    append("one\n a\n");
    EXPECT_THAT(entries(), IsEmpty());
    fs::resize_file(m_path, 0);
    append("two\n");
    EXPECT_THAT(entries(), ElementsAre("one\n a"));
    EXPECT_THAT(entries(seconds(6)), ElementsAre("two"));
    EXPECT_EQ(m_ledger.truncations(), 1);
}

TEST_F(FileFollowerJoinTest, ACopyHasTheRestOfAnEntry) {
    append("one\n a\n");
    EXPECT_THAT(entries(), IsEmpty());
    append(" b\n");
    copyAndTruncate("app.log.1");
    append("two\nthree\n");
    EXPECT_THAT(entries(), ElementsAre("one\n a\n b", "two"));
    EXPECT_EQ(m_ledger.losses(), 0);
}

TEST_F(FileFollowerJoinTest, WhatWasReadIsNotLostIfTheCopyHasLess) {
    append("zero\none\n a\n");
    EXPECT_THAT(entries(), ElementsAre("zero"));
    fs::copy_file(m_path, file("app.log.1"));
    append(" b\n");
    EXPECT_THAT(entries(), IsEmpty());
    fs::resize_file(m_path, 0);
    append("two\nthree\n");
    EXPECT_THAT(entries(), ElementsAre("one\n a\n b", "two"));
}

TEST_F(FileFollowerJoinTest, AnEntryOfAFileThatCannotBeReadAnyMoreIsGiven) {
    append("one\n a\n");
    EXPECT_THAT(entries(), IsEmpty());
    rename("app.log", "app.log.1");
    append("two\nthree\n");
    std::vector<std::string> all;
    {
        const Fault fault("pread", EIO, {.skip = 0, .times = -1});
        for (int count = 0; count < 8; ++count) {
            const auto some = entries(seconds(61));
            all.insert(all.end(), some.begin(), some.end());
        }
    }
    EXPECT_THAT(all, ElementsAre("one\n a"));
    EXPECT_THAT(entries(seconds(61)), ElementsAre("two"));
    EXPECT_EQ(m_ledger.losses(), 1);
}

TEST_F(FileFollowerJoinTest, AnEntryThatIsTakenBackIsReadAgainAfterARestart) {
    append("one\n a\ntwo\n");
    m_now += seconds(1);
    ASSERT_TRUE(m_follower->look({m_now, 0}));
    ASSERT_NE(m_follower->next(), nullptr);
    ASSERT_TRUE(m_follower->takeBack());
    restart();
    EXPECT_THAT(entries(), ElementsAre("one\n a"));
}

/// A line that ends with a backslash is continued by the next one.
class BackslashJoin final : public LineJoin {
public:
    BackslashJoin() : LineJoin({.wait = seconds(5)}) {}
    const std::string& definition() const noexcept override { return m_definition; }

protected:
    bool continues(std::string_view before, std::string_view /*line*/) const override {
        return before.ends_with('\\');
    }
    bool mayBeContinued(std::string_view line) const override { return line.ends_with('\\'); }

private:
    const std::string m_definition = "backslash";
};

TEST_F(FileFollowerJoinTest, ALineThatNoOtherContinuesDoesNotWait) {
    m_options.join = std::make_shared<BackslashJoin>();
    begin();
    EXPECT_THAT(entries(), IsEmpty());
    append("one\ntwo\\\nparts\nthree\\\n");
    EXPECT_THAT(entries(), ElementsAre("one", "two\\\nparts"));
    EXPECT_THAT(entries(seconds(6)), ElementsAre("three\\"));
}

TEST_F(FileFollowerJoinTest, LateLinesWaitForOthers) {
    append("one\n");
    rename("app.log", "app.log.1");
    append("two\n");
    entries();
    EXPECT_THAT(entries(seconds(3)), ElementsAre("one"));
    EXPECT_THAT(entries(seconds(3)), IsEmpty());
    EXPECT_THAT(entries(seconds(5)), ElementsAre("two"));
    m_directory.append("app.log.1", "late\n a\n");
    EXPECT_THAT(entries(), IsEmpty());
    m_directory.append("app.log.1", " b\n");
    EXPECT_THAT(entries(seconds(4)), IsEmpty());
    EXPECT_THAT(entries(seconds(5)), ElementsAre("late\n a\n b"));
    m_directory.append("app.log.1", "later\nlatest\n");
    EXPECT_THAT(entries(), ElementsAre("later"));
    EXPECT_THAT(entries(seconds(5)), ElementsAre("latest"));
    EXPECT_THAT(entries(seconds(5)), IsEmpty());
}

TEST_F(FileFollowerJoinTest, LateLinesOfOneFileAreGivenOnceWhileThoseOfAnotherWait) {
    rename("app.log", "app.log.2");
    append("one\n");
    EXPECT_THAT(entries(), IsEmpty());
    rename("app.log", "app.log.1");
    append("two\n");
    EXPECT_THAT(entries(seconds(6)), IsEmpty());
    EXPECT_THAT(entries(seconds(6)), ElementsAre("one"));
    EXPECT_THAT(entries(seconds(6)), ElementsAre("two"));
    m_directory.append("app.log.1", "a\nb\n");
    EXPECT_THAT(entries(), ElementsAre("a"));
    m_directory.append("app.log.2", "waits\n");
    EXPECT_TRUE(m_follower->look({m_now += seconds(6), 0}));
    EXPECT_STREQ(m_follower->next(), "b\n");
    EXPECT_EQ(m_follower->next(), nullptr);
    EXPECT_THAT(entries(seconds(6)), ElementsAre("waits"));
}

} // namespace
