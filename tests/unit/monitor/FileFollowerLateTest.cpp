#include "FileFollowerTest.h"

#include "monitor/Interruption.h"

namespace {

/// A log whose file was rotated, and whose successor is read.
class LateLinesTest : public FileFollowerTest {
protected:
    LateLinesTest() {
        look();
        append("a\n");
        rename("app.log", "app.log.1");
        append("b\n");
        EXPECT_EQ(looks(2), "a\nb\n");
    }

    void appendLate(std::string_view text) { m_directory.append("app.log.1", text); }
    std::vector<bool> watched() {
        std::vector<bool> watched;
        for (const LateLines::Left& left : m_follower->takeLeft()) {
            watched.push_back(left.isWatched);
        }
        return watched;
    }
};

TEST_F(LateLinesTest, AreReadOnceBesideThePresentFile) {
    appendLate("late\n");
    append("c\n");
    EXPECT_EQ(look(), "c\nlate\n");
    EXPECT_EQ(looks(3), "");
    appendLate("later\n");
    EXPECT_EQ(look(), "later\n");
    rename("app.log.1", "app.log.2");
    rename("app.log", "app.log.1");
    append("d\n");
    m_directory.append("app.log.2", "latest\n");
    EXPECT_EQ(looks(3), "latest\nd\n");
    EXPECT_EQ(m_ledger.losses(), 0);
}

TEST_F(LateLinesTest, DoNotMoveThePosition) {
    const auto position = m_follower->position();
    appendLate("late\n");
    EXPECT_EQ(look(), "late\n");
    EXPECT_EQ(m_follower->position()->offset, position->offset);
    EXPECT_EQ(m_follower->position()->inode, position->inode);
    append("c\n");
    restart();
    EXPECT_EQ(looks(2), "c\n");
}

TEST_F(LateLinesTest, MoveThePositionThatIsStillInTheirFile) {
    rename("app.log", "app.log.0");
    m_directory.write("app.log", "");
    EXPECT_EQ(looks(3), "");
    m_directory.append("app.log.0", "late\n");
    EXPECT_EQ(look(), "late\n");
    append("c\n");
    restart();
    EXPECT_EQ(looks(3), "c\n");
}

TEST_F(LateLinesTest, AreNotReadAgainAfterARestart) {
    appendLate("late\n");
    EXPECT_EQ(look(), "late\n");
    m_directory.append("app.log.1", "later\nunfinished");
    rename("app.log.1", "app.log.old"); // times decide, and this file is the youngest
    append("c\n");
    restart();
    EXPECT_EQ(looks(3), "c\nlater\n");
    m_directory.append("app.log.old", " line\n");
    EXPECT_EQ(look(), "unfinished line\n");
    EXPECT_EQ(m_ledger.losses(), 0);
}

TEST_F(LateLinesTest, AreReadOnceAfterACrash) {
    appendLate("late\n");
    EXPECT_EQ(look(), "late\n");
    const auto stored = m_follower->position();
    appendLate("later\n");
    append("c\n");
    EXPECT_EQ(look(), "c\nlater\n");
    begin(stored);
    EXPECT_EQ(looks(3), "c\nlater\n");
}

TEST_F(LateLinesTest, AreReadOfAFileThatWasCompressedMeanwhile) {
    appendLate("late\n");
    EXPECT_EQ(look(), "late\n");
    const auto stored = m_follower->position();
    m_directory.write("app.log.1.gz", "GZold\na\nlate\nlater\nlast");
    fs::remove(file("app.log.1"));
    append("c\n");
    begin(stored);
    EXPECT_EQ(looks(3), "c\nlater\nlast\n");
    EXPECT_TRUE(m_follower->position()->late.files().empty());
    restart();
    EXPECT_EQ(looks(3), "");
    EXPECT_EQ(m_ledger.losses(), 0);
}

TEST_F(LateLinesTest, AreReadOfACompressedFileWhoseInodeTheLogHasGot) {
    appendLate("late\n");
    EXPECT_EQ(look(), "late\n");
    auto stored = m_follower->position();
    LogPosition left = stored->late.files().at(0);
    left.inode = Generation::open(m_path)->identity().inode;
    stored->late = LatePositions({left});
    stored->inode = 0; // its file is gone
    m_directory.write("app.log.1.gz", "GZold\na\nlate\nlater\n");
    fs::remove(file("app.log.1"));
    fs::resize_file(m_path, 0);
    append("c\n");
    begin(stored);
    EXPECT_EQ(looks(3), "c\nlater\n");
}

TEST_F(LateLinesTest, AreReadOfACompressedFileWhoseInodeAnotherOneHasGot) {
    auto stored = m_follower->position();
    const LogPosition first = stored->late.files().at(0);
    m_directory.write("app.log.1.gz", "GZold\na\nlate\n");
    m_directory.write("app.log.2", "b\n");
    const auto other = Generation::open(file("app.log.2"));
    Tail tail;
    ASSERT_TRUE(other->readTail(2, tail));
    const LogPosition second =
        positionOf(Generation::open(file("app.log.1.gz"))->identity(), 2, tail);
    m_directory.write("app.log.2.gz", "GZb\nlater\n");
    fs::remove(file("app.log.1"));
    fs::remove(file("app.log.2"));
    stored->late = LatePositions({first, second});
    begin(stored);
    EXPECT_EQ(looks(3), "late\nlater\n");
}

TEST_F(LateLinesTest, DamageOfAFileThatWasCompressedMeanwhileIsALoss) {
    const auto stored = m_follower->position();
    m_directory.write("app.log.1.gz", "GZold\na\nlate\n\x01");
    fs::remove(file("app.log.1"));
    begin(stored);
    EXPECT_EQ(looks(3), "");
    ASSERT_EQ(m_ledger.lost().size(), 1U);
    EXPECT_EQ(m_ledger.lost()[0].source, file("app.log.1.gz"));
}

TEST_F(LateLinesTest, AnotherFileThatHasTheInodeOfAnEmptyOneIsNotReadAgain) {
    const auto position = m_follower->position();
    for (const char* const name : {"app.log.2.gz", "app.log.2"}) {
        age(file(name), 50, "GZread before\n");
        auto stored = position;
        LogPosition left = positionOf(Generation::open(file(name))->identity(), 0, {});
        left.modified = stored->modified;
        stored->late = LatePositions({left});
        begin(stored);
        EXPECT_EQ(looks(3), "") << name;
        EXPECT_TRUE(m_follower->position()->late.files().empty()) << name;
    }
    EXPECT_EQ(m_ledger.losses(), 0);
}

TEST_F(LateLinesTest, AreReadAfterARestartOfAFileThatWasEmpty) {
    rename("app.log", "app.log.0");
    m_directory.write("app.log", "");
    look();
    rename("app.log", "app.log.empty");
    append("c\n");
    EXPECT_EQ(looks(5), "c\n");
    restart();
    EXPECT_EQ(look(), "");
    m_directory.append("app.log.empty", "late\n");
    EXPECT_EQ(looks(2), "late\n");
}

TEST_F(LateLinesTest, AFileThatGetsItsNameBackWhileStoppedIsReadOn) {
    appendLate("late\n");
    EXPECT_EQ(look(), "late\n");
    const auto stored = m_follower->position();
    rename("app.log", "app.log.2");
    rename("app.log.1", "app.log");
    append("c\n");
    begin(stored);
    EXPECT_EQ(looks(3), "c\n");
}

TEST_F(LateLinesTest, AreReadOnceWhenTheNextFileIsTruncatedBeforeItHasAnEntry) {
    rename("app.log", "app.log.0");
    append("unfinished");
    EXPECT_EQ(looks(3), "");
    m_directory.append("app.log.0", "late\n");
    fs::resize_file(m_path, 0);
    EXPECT_EQ(looks(2), "late\n");
    append("c\n");
    EXPECT_EQ(looks(2), "c\n");
}

TEST_F(LateLinesTest, AreTakenBack) {
    const auto position = m_follower->position();
    appendLate("late\n");
    m_now += seconds(1);
    ASSERT_TRUE(m_follower->look({m_now, 0}));
    EXPECT_STREQ(m_follower->next(), "late\n");
    EXPECT_TRUE(m_follower->isLate());
    EXPECT_EQ(m_follower->text(), "late");
    EXPECT_NE(m_follower->position()->late, position->late);
    EXPECT_TRUE(m_follower->takeBack());
    EXPECT_EQ(m_follower->position()->offset, position->offset);
    EXPECT_EQ(m_follower->position()->late.files().at(0).offset,
              position->late.files().at(0).offset);
    EXPECT_STREQ(m_follower->next(), "late\n");
}

TEST_F(LateLinesTest, WaitForTheirEnd) {
    appendLate("la");
    EXPECT_EQ(look(), "");
    appendLate("te\nunfinished");
    EXPECT_EQ(look(), "late\n");
    EXPECT_EQ(watched(), std::vector<bool>{true});
    EXPECT_EQ(look(LateLines::watchedFor), "");
    EXPECT_EQ(watched(), std::vector<bool>{false});
    ASSERT_EQ(m_ledger.lost().size(), 1U);
    EXPECT_EQ(m_ledger.lost()[0].from, 11);
    EXPECT_EQ(m_ledger.lost()[0].to, 21);
}

TEST_F(LateLinesTest, ProlongTheWatch) {
    constexpr seconds half = LateLines::watchedFor / 2;
    for (int i = 0; i < 4; ++i) {
        appendLate("late\n");
        EXPECT_EQ(look(half), "late\n");
    }
    look(half);
    look(half);
    EXPECT_EQ(watched(), std::vector<bool>{false});
    EXPECT_TRUE(watched().empty());
    appendLate("too late\n");
    EXPECT_EQ(look(), "");
}

TEST_F(LateLinesTest, AFileThatIsRemovedIsReadAndClosed) {
    appendLate("late\n");
    fs::remove(file("app.log.1"));
    EXPECT_EQ(look(), "late\n");
    look();
    EXPECT_EQ(watched(), std::vector<bool>{false});
}

TEST_F(LateLinesTest, ACompressedCopyOfTheirFileIsNotReadToo) {
    appendLate("late\n");
    m_directory.write("app.log.1.gz", "GZold\na\nlate\n");
    age(file("app.log.1"), -5); // younger than all that was read
    fs::last_write_time(file("app.log.1.gz"), fs::last_write_time(file("app.log.1")));
    fs::remove(file("app.log.1"));
    fs::remove(m_path); // so that times decide
    append("c\n");
    EXPECT_EQ(looks(4), "late\nc\n");
    EXPECT_EQ(m_ledger.losses(), 0);
}

TEST_F(LateLinesTest, AFileThatIsTruncatedIsLeft) {
    fs::resize_file(file("app.log.1"), 0);
    appendLate("another\n");
    fs::resize_file(file("app.log.1"), 3);
    EXPECT_EQ(look(), "");
    EXPECT_EQ(watched(), std::vector<bool>{false});
}

TEST_F(LateLinesTest, AFileThatGetsItsNameBackIsReadOn) {
    appendLate("late\n");
    EXPECT_EQ(look(), "late\n");
    rename("app.log.1", "app.log");
    append("c\n");
    EXPECT_EQ(looks(3), "c\n");
}

TEST_F(LateLinesTest, GiveUpTheirDescriptorsWhenThereAreNoOthers) {
    rename("app.log.1", "app.log.2");
    rename("app.log", "app.log.1");
    append("c\n");
    {
        const Fault fault("open", EMFILE);
        look();
        EXPECT_EQ(fault.failed(), 1);
    }
    EXPECT_EQ(watched(), std::vector<bool>{false});
    EXPECT_EQ(looks(3), "c\n");
}

TEST_F(LateLinesTest, ARotatedFileWithoutNewLinesIsNoYoungerGeneration) {
    appendLate("late\n");
    EXPECT_EQ(look(), "late\n");
    rename("app.log.1", "app.log.old"); // from now on times decide
    append("c\n");
    rename("app.log", "app.log.1");
    m_directory.append("app.log.old", "later\n");
    append("d\n");
    EXPECT_EQ(looks(3), "c\nlater\nd\n");
}

TEST_F(FileFollowerTest, TriesAgainToOpenTheCopyOfWhatATruncationRemoved) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    append("b\n");
    copyAndTruncate("app.log.1");
    append("c\n");
    std::string text;
    {
        const Fault fault("open", EACCES, {.times = -1});
        EXPECT_EQ(looks(2), "");
        EXPECT_GE(fault.failed(), 2);
        ASSERT_TRUE(m_ledger.failure());
        EXPECT_EQ(m_ledger.failure()->file, file("app.log.1"));
    }
    EXPECT_EQ(looks(5), "b\nc\n");
    EXPECT_FALSE(m_ledger.failure());
    EXPECT_EQ(m_ledger.losses(), 0);
    EXPECT_EQ(m_ledger.recoveredBytes(), 2);
    EXPECT_EQ(m_ledger.truncations(), 1);
}

TEST_F(FileFollowerTest, TriesAgainToOpenTheCopyOfAFileOfWhichNothingWasRead) {
    m_options.fromBeginning = true;
    fs::resize_file(m_path, 0);
    age(m_path, 50);
    begin();
    EXPECT_EQ(look(), "");
    append("a\n");
    copyAndTruncate("app.log.1");
    append("b\n");
    {
        const Fault fault("open", EACCES, {.times = -1});
        EXPECT_EQ(looks(2), "");
        EXPECT_GE(fault.failed(), 2);
    }
    EXPECT_EQ(looks(5), "a\nb\n");
    EXPECT_EQ(m_ledger.losses(), 0);
}

TEST_F(FileFollowerTest, NamesTheCopyThatCannotBeRead) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    append("bb\n");
    m_directory.write("app.log.1.gz", "GZ\x01");
    fs::resize_file(m_path, 0);
    append("c\n");
    EXPECT_EQ(looks(20), "c\n");
    ASSERT_EQ(m_ledger.lost().size(), 1U);
    EXPECT_EQ(m_ledger.lost()[0].source, file("app.log.1.gz"));
    EXPECT_EQ(m_ledger.lost()[0].from, 6);
    EXPECT_EQ(m_ledger.truncations(), 1);
    append("d\n");
    rename("app.log", "app.log.2");
    append("e\n");
    EXPECT_EQ(looks(4), "d\ne\n");
    EXPECT_EQ(m_ledger.losses(), 1); // it is not waited for again
}

TEST_F(FileFollowerTest, ASearchThatIsInterruptedChangesNothing) {
    const std::string text = std::string(3'000'000, 'x') + "\n";
    append(text);
    look();
    m_options.fromBeginning = true;
    begin();
    look();
    const auto position = m_follower->position();
    m_directory.write("app.log.1.gz", "GZold\n" + text + "b\n");
    fs::remove(m_path);
    append("c\n");
    begin(position);
    int asked = 0;
    {
        const Interruption interruption([&asked] { return ++asked > 1; });
        EXPECT_EQ(look(), "");
        EXPECT_GT(asked, 1);
        EXPECT_EQ(m_follower->position(), position);
        EXPECT_EQ(m_ledger.losses(), 0);
    }
    EXPECT_EQ(looks(3), "b\nc\n");
    EXPECT_EQ(m_ledger.losses(), 0);
}

} // namespace
