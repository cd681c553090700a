// Where reading goes on after a stop, a truncation or a refresh.
#include "FileFollowerTest.h"

namespace {

TEST_F(FileFollowerTest, RecoversFromACopyWhatATruncationRemoved) {
    look();
    append("a\n");
    look();
    append("b\nc\n");
    copyAndTruncate("app.log.1");
    append("d\n");
    EXPECT_EQ(look(), "b\nc\nd\n");
    ASSERT_EQ(m_ledger.recovered().size(), 1U);
    EXPECT_EQ(m_ledger.recovered()[0].source, file("app.log.1"));
    EXPECT_EQ(m_ledger.recovered()[0].from, 6);
    EXPECT_EQ(m_ledger.recovered()[0].to, 10);
    EXPECT_EQ(m_ledger.recoveredBytes(), 4);
    EXPECT_EQ(m_ledger.losses(), 0);
    EXPECT_EQ(m_ledger.truncations(), 1);
}

TEST_F(FileFollowerTest, DoesNotReadACopyAgainThatEndsBeforeThePosition) {
    for (const std::size_t length : {std::size_t{3}, std::size_t{400}}) {
        fs::remove(file("app.log.1"));
        look();
        const std::string line = std::string(length, 'x') + "\n";
        append(line);
        EXPECT_EQ(look(), line);
        fs::copy_file(m_path, file("app.log.1"));
        append("between\n");
        EXPECT_EQ(look(), "between\n"); // before the truncation
        // As if the copy had been made while the follower was reading.
        fs::last_write_time(file("app.log.1"), fs::last_write_time(m_path) + seconds(1));
        fs::resize_file(m_path, 0);
        append("new\n");
        EXPECT_EQ(looks(3), "new\n");
    }
    EXPECT_EQ(m_ledger.recoveredBytes(), 0);
}

TEST_F(FileFollowerTest, RecoversAnUnfinishedLineOfAFileThatIsTruncatedTwice) {
    look();
    append("a long line\n");
    EXPECT_EQ(look(), "a long line\n");
    fs::resize_file(m_path, 0);
    EXPECT_EQ(look(), "");
    append("half");
    EXPECT_EQ(look(), "");
    copyAndTruncate("app.log.1");
    append("new\n");
    EXPECT_EQ(looks(3), "half\nnew\n");
}

TEST_F(FileFollowerTest, RecoversFromACompressedCopy) {
    look();
    append("a\n");
    copyAndTruncate("app.log.1");
    m_directory.write("app.log.1.gz", "GZold\na\n");
    fs::remove(file("app.log.1"));
    append("b\n");
    EXPECT_EQ(look(), "a\nb\n");
}

TEST_F(FileFollowerTest, NoticesATruncationThatGrewPastThePosition) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    append("b\n");
    copyAndTruncate("app.log.1");
    append("something longer than before\n");
    EXPECT_EQ(look(), "b\nsomething longer than before\n");
}

TEST_F(FileFollowerTest, DoesNotRecordWhatIsInTheFileAfterATruncationAsLost) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    fs::resize_file(m_path, 0);
    append("something longer than before\n");
    EXPECT_EQ(look(), "something longer than before\n");
    EXPECT_EQ(m_ledger.lostBytes(), 0);
}

TEST_F(FileFollowerTest, RecordsWhatIsLost) {
    look();
    append("0123456789\n");
    EXPECT_EQ(look(), "0123456789\n");
    append("half");
    EXPECT_EQ(look(), "");
    fs::resize_file(m_path, 0);
    append("new\n");
    EXPECT_EQ(look(), "new\n");
    ASSERT_EQ(m_ledger.lost().size(), 1U);
    EXPECT_EQ(m_ledger.lost()[0].from, 15);
    EXPECT_EQ(m_ledger.lost()[0].to, 19);
    EXPECT_EQ(m_ledger.lostBytes(), 4);
}

TEST_F(FileFollowerTest, GoesOnInAFileThatReplacesTheLogWithTheSameContents) {
    look();
    append("a\n");
    look();
    m_directory.write("copy", "old\na\nb\n");
    rename("copy", "app.log");
    EXPECT_EQ(looks(2), "b\n");
}

TEST_F(FileFollowerTest, ResumesInThePresentFileWithoutReadingTheDirectory) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    append("b\n");
    restart();
    {
        const Fault reads("opendir", 0, {.skip = 0, .times = 0});
        EXPECT_EQ(look(), "b\n");
        EXPECT_EQ(reads.calls(), 0);
    }
    rename("app.log", "app.log.1");
    append("c\n");
    restart();
    const Fault reads("opendir", 0, {.skip = 0, .times = 0});
    EXPECT_EQ(looks(2), "c\n");
    EXPECT_GT(reads.calls(), 0);
}

TEST_F(FileFollowerTest, ResumesAfterRotationsWhileItWasStopped) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    append("b\n");
    rename("app.log", "app.log.2");
    m_directory.write("app.log.1.gz", "GZc\n");
    append("d\n");
    restart();
    EXPECT_EQ(looks(2), "b\nc\nd\n");
    EXPECT_EQ(m_ledger.losses(), 0);
}

TEST_F(FileFollowerTest, ResumesInACompressedFile) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    fs::remove(m_path);
    m_directory.write("app.log.1.gz", "GZold\na\nb\n");
    append("c\n");
    restart();
    EXPECT_EQ(look(), "b\nc\n");
}

TEST_F(FileFollowerTest, RecognisesAnInodeThatIsUsedAgain) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    LogPosition position = *m_follower->position();
    fs::resize_file(m_path, 0);
    append("other contents, and longer\n");
    begin(position);
    EXPECT_EQ(look(), "other contents, and longer\n");
    EXPECT_EQ(m_ledger.losses(), 1);
}

TEST_F(FileFollowerTest, ACompressedFileThatHasTheInodeOfAnEmptyOneIsNotReadAgain) {
    age(file("app.log.2.gz"), 50, "GZread before\n");
    age(m_path, 40);
    fs::resize_file(m_path, 0);
    look();
    LogPosition position = *m_follower->position();
    EXPECT_EQ(position.offset, 0);
    position.inode = Generation::open(file("app.log.2.gz"))->identity().inode;
    rename("app.log", "app.log.1");
    append("a\n");
    begin(position);
    EXPECT_EQ(looks(3), "a\n");
    EXPECT_EQ(m_ledger.losses(), 0);
}

TEST_F(FileFollowerTest, APositionBeyondTheEndBeginsAtTheBeginning) {
    look();
    LogPosition position = *m_follower->position();
    position.offset = 1'000'000;
    begin(position);
    EXPECT_EQ(look(), "old\n");
}

TEST_F(FileFollowerTest, APositionOfAFileThatIsGoneBeginsAtTheBeginning) {
    look();
    append("a\n");
    look();
    const auto position = m_follower->position();
    begin();
    fs::remove(m_path);
    append("entirely new\n");
    begin(position);
    EXPECT_EQ(look(), "entirely new\n");
}

TEST_F(FileFollowerTest, WithoutTheFileOfThePositionReadsTheYoungerGenerations) {
    age(file("app.log.1"), 50, "before the position\n");
    age(m_path, 45);
    look();
    append("a\n");
    age(m_path, 40);
    EXPECT_EQ(look(), "a\n");
    const auto position = m_follower->position();
    begin();
    fs::remove(m_path);
    fs::remove(file("app.log.1"));
    age(file("app.log.3"), 60, "before the position\n");
    age(file("app.log.2"), 30, "b\n");
    age(file("app.log.1"), 20, "c\n");
    begin(position);
    EXPECT_EQ(looks(3), "b\nc\n"); // nothing has the log's name yet
    EXPECT_EQ(m_ledger.losses(), 1);
    append("d\n");
    EXPECT_EQ(looks(3), "d\n");
    EXPECT_EQ(m_ledger.losses(), 1);
    EXPECT_EQ(m_ledger.lost().at(0).from, position->offset);
}

TEST_F(FileFollowerTest, ResumesInTheDirectoryToWhichRotationMovesFiles) {
    for (const char* const directory : {"old", "."}) {
        m_options.rotatedTo = directory;
        fs::create_directory(file("old"));
        const std::string to = file(directory) + "/app.log";
        restart();
        look();
        append("a\n");
        EXPECT_EQ(look(), "a\n");
        append("b\n");
        fs::rename(m_path, to + ".2");
        std::ofstream(to + ".1") << "c\n";
        append("d\n");
        restart();
        EXPECT_EQ(looks(4), "b\nc\nd\n") << directory;
        EXPECT_EQ(m_ledger.losses(), 0);
    }
}

TEST_F(FileFollowerTest, APositionWithoutATimeHasNoYoungerGenerations) {
    look();
    append("a\n");
    look();
    auto position = m_follower->position();
    EXPECT_NE(position->modified, 0);
    position->modified = 0; // stored by an earlier version
    begin();
    fs::remove(m_path);
    age(file("app.log.1"), 10, "perhaps read\n");
    append("b\n");
    begin(position);
    EXPECT_EQ(looks(3), "b\n");
    EXPECT_EQ(m_ledger.losses(), 1);
}

TEST_F(FileFollowerTest, ReadsTheCopiesOfAFileThatWasTruncatedBeforeAnythingOfItWasRead) {
    m_options.fromBeginning = true;
    age(m_path, 50);
    fs::resize_file(m_path, 0);
    age(m_path, 50);
    begin();
    EXPECT_EQ(look(), "");
    const auto position = m_follower->position();
    begin();
    append("a\n");
    copyAndTruncate("app.log.1");
    append("b\n");
    begin(position);
    EXPECT_EQ(looks(3), "a\nb\n");
}

TEST_F(FileFollowerTest, TakesBackAnEntryThatIsNotJudged) {
    look();
    append("a\nb\nc\n");
    m_now += seconds(1);
    ASSERT_TRUE(m_follower->look({m_now, 0}));
    EXPECT_STREQ(m_follower->next(), "a\n");
    const auto behind = m_follower->position();
    EXPECT_STREQ(m_follower->next(), "b\n");
    EXPECT_TRUE(m_follower->takeBack());
    EXPECT_EQ(m_follower->position(), behind);
    restart();
    EXPECT_EQ(look(), "b\nc\n");
}

TEST_F(FileFollowerTest, TheFirstEntryOfAFileTakenBackLeavesThePositionInTheOneBefore) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    const auto behind = m_follower->position();
    rename("app.log", "app.log.1");
    append("b\n");
    look();
    m_now += seconds(3);
    ASSERT_TRUE(m_follower->look({m_now, 0}));
    EXPECT_STREQ(m_follower->next(), "b\n");
    EXPECT_NE(m_follower->position()->inode, behind->inode);
    EXPECT_TRUE(m_follower->takeBack());
    EXPECT_EQ(m_follower->position()->inode, behind->inode);
    EXPECT_EQ(m_follower->position()->offset, behind->offset);
}

TEST_F(FileFollowerTest, WaitsForAGenerationThatCannotBeRead) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    rename("app.log", "app.log.2");
    m_directory.write("app.log.1.gz", "GZ\x01");
    append("c\n");
    restart();
    EXPECT_EQ(looks(3), "");
    ASSERT_TRUE(m_ledger.failure());
    EXPECT_STREQ(m_ledger.failure()->call, "read");
    m_directory.write("app.log.1.gz", "GZb\n");
    EXPECT_EQ(looks(5), "b\nc\n");
    EXPECT_FALSE(m_ledger.failure());
    EXPECT_EQ(m_ledger.losses(), 0);
}

TEST_F(FileFollowerTest, TriesAgainToOpenAGeneration) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    rename("app.log", "app.log.2");
    m_directory.write("app.log.1", "b\n");
    append("c\n");
    std::string text;
    {
        const Fault fault("open", EACCES, {.skip = 1, .times = 1});
        text = look();
        EXPECT_EQ(fault.failed(), 1);
        ASSERT_TRUE(m_ledger.failure());
        EXPECT_STREQ(m_ledger.failure()->call, "open");
        EXPECT_EQ(m_ledger.failure()->number, EACCES);
    }
    EXPECT_EQ(text + looks(4), "b\nc\n");
    EXPECT_FALSE(m_ledger.failure());
}

TEST_F(FileFollowerTest, RecordsAGenerationAsLostThatCannotBeReadForLong) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    fs::remove(m_path);
    m_directory.write("app.log.1.gz", "GZ\x01");
    append("c\n");
    restart();
    EXPECT_EQ(looks(10), "");
    EXPECT_EQ(looks(10), "c\n");
    EXPECT_FALSE(m_ledger.failure());
    ASSERT_EQ(m_ledger.lost().size(), 2U); // that generation, and the rest of the first file
    EXPECT_EQ(m_ledger.lost()[0].from, 0);
    EXPECT_EQ(m_ledger.lost()[0].to, 0); // the length of compressed contents is not known
    append("d\n");
    EXPECT_EQ(looks(2), "d\n");
    EXPECT_EQ(m_ledger.losses(), 2);
}

TEST_F(FileFollowerTest, DoesNotWaitForAFileThatIsBeingCompressed) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    rename("app.log", "app.log.2");
    m_directory.write("app.log.1", "b\n");
    m_directory.write("app.log.1.gz", "GZ\x01");
    append("c\n");
    restart();
    EXPECT_EQ(looks(3), "b\nc\n");
    EXPECT_EQ(m_ledger.losses(), 0);
}

TEST_F(FileFollowerTest, TheBeginningOfALongLineIsNotTakenBack) {
    look();
    append(std::string(3000, 'x') + "\n");
    m_now += seconds(1);
    ASSERT_TRUE(m_follower->look({m_now, 0}));
    ASSERT_NE(m_follower->next(), nullptr);
    EXPECT_FALSE(m_follower->takeBack());
}

TEST_F(FileFollowerTest, WhatFollowedATruncationIsFoundUnderAnotherName) {
    age(m_path, 100);
    look();
    append("a\n");
    age(m_path, 90);
    EXPECT_EQ(look(), "a\n");
    fs::resize_file(m_path, 0);
    append("unfinished");
    age(m_path, 50);
    EXPECT_EQ(look(), ""); // the position is still behind what was removed
    m_directory.write("app.log.1.gz", "GZunfinished");
    fs::last_write_time(file("app.log.1.gz"), fs::last_write_time(m_path));
    fs::remove(m_path);
    append("b\n");
    restart();
    EXPECT_EQ(looks(2), "unfinished\nb\n");
}

} // namespace
