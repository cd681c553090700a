#include "FileFollowerTest.h"
#include "TestJoin.h"

// What a truncated file had, and what it has after that, around restarts and in files that other
// files follow.

namespace {

class TruncatedFileTest : public FileFollowerTest {
protected:
    TruncatedFileTest() {
        age(m_path, 90);
        look();
        append("a\n");
        age(m_path, 60);
        EXPECT_EQ(look(), "a\n");
    }

    /// What a run reads that begins at the position after the file has been rotated.
    std::string readAfterRotation(const std::optional<LogPosition>& stored) {
        rename("app.log", "app.log-20260002");
        begin(stored);
        return looks(3);
    }
};

TEST_F(TruncatedFileTest, HasNewContentsThatAreYoungerThanThePosition) {
    fs::resize_file(m_path, 0);
    append("b\n");
    EXPECT_TRUE(m_follower->look({m_now + seconds(1), 0}));
    EXPECT_EQ(readAfterRotation(m_follower->position()), "b\n")
        << "nothing was read after the look";
}

TEST_F(TruncatedFileTest, HasNewContentsThatAreYoungerThanAnEntryGivenFromMemory) {
    m_options.join = TestJoin::indented({.wait = seconds(60)});
    restart();
    append("waits\n");
    EXPECT_EQ(look(), "");
    fs::resize_file(m_path, 0);
    append("b\n");
    EXPECT_TRUE(m_follower->look({m_now + seconds(1), 0}));
    EXPECT_STREQ(m_follower->next(), "waits\n");
    const auto stored = m_follower->position();
    m_options.join = nullptr;
    EXPECT_EQ(readAfterRotation(stored), "b\n");
}

TEST_F(TruncatedFileTest, HasNewContentsThatAreYoungerThanACopyThatEndsBeforeThePosition) {
    fs::copy_file(m_path, file("app.log-20260001"));
    append("between\n");
    age(m_path, 50);
    EXPECT_EQ(look(), "between\n");
    age(file("app.log-20260001"), 40); // as if the copy had been made while the log was read
    fs::resize_file(m_path, 0);
    append("unfinished");
    age(m_path, 30);
    EXPECT_EQ(look(), "");
    const auto stored = m_follower->position();
    const auto modified = fs::last_write_time(m_path);
    append(" line\n");
    fs::last_write_time(m_path, modified); // within the same tick of the file system's clock
    EXPECT_EQ(readAfterRotation(stored), "unfinished line\n");
}

TEST_F(TruncatedFileTest, DoesNotHaveTheShortCopyReadWhenItIsTruncatedAgain) {
    fs::copy_file(m_path, file("app.log-20260001"));
    append("between\n");
    EXPECT_EQ(look(), "between\n");
    age(file("app.log-20260001"), -1); // as if the copy had been made while the log was read
    fs::resize_file(m_path, 0);
    append("unfinished");
    EXPECT_EQ(looks(2), "");
    fs::resize_file(m_path, 0);
    append("b\n");
    EXPECT_EQ(looks(3), "b\n");
}

TEST_F(TruncatedFileTest, IsContinuedInACopyAlsoIfItHasReplacedAnotherFile) {
    m_directory.write("copy", "old\na\n");
    rename("copy", "app.log");
    EXPECT_EQ(looks(3), "");
    append("b\n");
    copyAndTruncate("app.log-20260001");
    append("c\n");
    EXPECT_EQ(looks(3), "b\nc\n");
    EXPECT_EQ(m_ledger.losses(), 0);
}

TEST_F(FileFollowerTest, AGenerationFromBeforeTheFirstStartIsNotReadLater) {
    age(m_path, 60);
    age(file("app.log.1"), 30, "older, but written later\n");
    append("a\n");
    age(m_path, 60);
    m_options.fromBeginning = true;
    begin();
    EXPECT_EQ(look(), "old\na\n");
    const auto stored = m_follower->position();
    fs::remove(m_path);
    append("b\n");
    begin(stored);
    EXPECT_EQ(looks(3), "b\n");
}

TEST_F(FileFollowerTest, AGenerationThatWasEmptyAtFirstIsWatchedForLateLines) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    rename("app.log", "app.log-20260001");
    m_directory.write("app.log-20260002", ""); // the writer has it
    m_directory.write("app.log", "");
    EXPECT_EQ(look(), "");
    m_directory.append("app.log-20260002", "b\n");
    EXPECT_EQ(looks(3), "b\n");
    append("c\n");
    EXPECT_EQ(looks(3), "c\n");
    m_directory.append("app.log-20260002", "late\n");
    EXPECT_EQ(looks(2), "late\n");
    restart();
    EXPECT_EQ(looks(2), "");
}

TEST_F(FileFollowerTest, AnEmptyFileThatIsGoneDoesNotHideOneThatIsWrittenLater) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    rename("app.log", "app.log-20260001");
    m_directory.write("app.log-20260002", ""); // the writer has it
    m_directory.write("app.log", "");
    age(m_path, 30);
    EXPECT_EQ(look(), "");
    rename("app.log", "app.log-20260003");
    m_directory.append("app.log-20260002", "b\n");
    m_directory.write("app.log-20260004", "c\n");
    m_directory.write("app.log", "");
    EXPECT_EQ(look(), "");
    fs::remove(file("app.log-20260003"));
    EXPECT_EQ(looks(4), "b\nc\n");
    EXPECT_EQ(m_ledger.losses(), 0);
}

} // namespace
