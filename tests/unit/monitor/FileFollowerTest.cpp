#include "monitor/FileFollower.h"

#include "FakeCompression.h"
#include "support/Faults.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <filesystem>
#include <fstream>

#include <sys/stat.h>
#include <unistd.h>

using namespace zrm;
namespace fs = std::filesystem;

namespace {

using std::chrono::seconds;
using State = FollowLedger::State;

class FileFollowerTest : public testing::Test {
protected:
    FileFollowerTest() {
        m_options.rotateWait = seconds(2);
        begin();
    }

    void begin(const std::optional<LogPosition>& stored = std::nullopt) {
        m_follower = std::make_unique<FileFollower>(m_path, m_options, m_ledger);
        if (stored) {
            m_follower->resumeAt(*stored);
        }
    }

    /// What a look after some time delivers.
    std::string look(seconds passed = seconds(1)) {
        m_now += passed;
        std::string text;
        if (m_follower->look({m_now, 0})) {
            while (const char* const entry = m_follower->next()) {
                text += entry;
            }
        }
        m_follower->noteProgress();
        return text;
    }

    /// What several looks deliver, the later ones after any wait for a quiet file is over.
    std::string looks(int count) {
        std::string text = look();
        for (; count > 1; --count) {
            text += look(seconds(3));
        }
        return text;
    }

    void append(std::string_view text) { m_directory.append("app.log", text); }
    std::string file(std::string_view name) const { return m_directory.file(name); }
    void rename(std::string_view from, std::string_view to) { fs::rename(file(from), file(to)); }
    void copyAndTruncate(std::string_view to) {
        fs::copy_file(m_path, file(to));
        fs::resize_file(m_path, 0);
    }

    /// Writes a file, or takes one as it is, and sets its time of modification.
    static void age(const std::string& path, int secondsAgo, std::string_view text = {}) {
        if (!text.empty()) {
            std::ofstream(path) << text;
        }
        fs::last_write_time(path, fs::file_time_type::clock::now() - seconds(secondsAgo));
    }

    /// Begins another follower at the position.
    void restart() { begin(m_follower->position()); }

    const FakeCompression m_compression;
    TemporaryDirectory m_directory;
    std::string m_path = m_directory.write("app.log", "old\n");
    FileFollower::Options m_options;
    FollowLedger m_ledger;
    std::unique_ptr<FileFollower> m_follower;
    std::chrono::steady_clock::time_point m_now{std::chrono::hours(1)};
};

TEST_F(FileFollowerTest, BeginsAtTheEndOfAFileThatIsThere) {
    EXPECT_EQ(look(), "");
    append("a\nb\n");
    EXPECT_EQ(look(), "a\nb\n");
    EXPECT_EQ(m_ledger.position(), 8);
    EXPECT_EQ(m_ledger.state(), State::reading);
}

TEST_F(FileFollowerTest, BeginsAtTheBeginningIfItIsToldTo) {
    m_options.fromBeginning = true;
    begin();
    EXPECT_EQ(look(), "old\n");
}

TEST_F(FileFollowerTest, BeginsAtTheBeginningOfAFileThatAppears) {
    fs::remove(m_path);
    EXPECT_EQ(look(), "");
    EXPECT_EQ(m_ledger.state(), State::waiting);
    append("new\n");
    EXPECT_EQ(look(), "new\n");
}

TEST_F(FileFollowerTest, WaitsForTheEndOfALine) {
    look();
    append("ha");
    EXPECT_EQ(look(), "");
    EXPECT_EQ(m_follower->position()->offset, 4);
    EXPECT_EQ(look(), ""); // forgets it and reads it again
    append("lf\n");
    EXPECT_EQ(look(), "half\n");
}

TEST_F(FileFollowerTest, GivesALongLineAsOneEntry) {
    look();
    append(std::string(700'000, 'x'));
    EXPECT_EQ(look(), "");
    EXPECT_EQ(look(), "");
    EXPECT_EQ(m_follower->position()->offset, 4);
    append("\nshort\n");
    EXPECT_EQ(look(), std::string(2046, 'x') + "\nshort\n");
    EXPECT_EQ(m_ledger.cutEntries(), 1);
    restart();
    append("next\n");
    EXPECT_EQ(look(), "next\n");
}

TEST_F(FileFollowerTest, ReadsARenamedFileToItsEndAndThenTheNewOne) {
    look();
    append("a\n");
    rename("app.log", "app.log.1");
    append("c\n");
    EXPECT_EQ(look(), "a\n");
    EXPECT_EQ(m_ledger.state(), State::finishing);
    m_directory.append("app.log.1", "b");
    EXPECT_EQ(look(), "");
    EXPECT_EQ(look(), "");
    EXPECT_EQ(look(), "b\nc\n");
    EXPECT_EQ(m_ledger.state(), State::reading);
    EXPECT_EQ(m_ledger.generations(), 2);
}

TEST_F(FileFollowerTest, KeepsAFileThatNothingHasReplaced) {
    look();
    rename("app.log", "app.log.1");
    EXPECT_EQ(look(), "");
    EXPECT_EQ(m_ledger.state(), State::missing);
    m_directory.append("app.log.1", "a\n");
    EXPECT_EQ(look(seconds(60)), "a\n");
}

TEST_F(FileFollowerTest, ReadsSeveralGenerationsBetweenTwoLooks) {
    look();
    append("a\n");
    rename("app.log", "app.log.1");
    append("b\n");
    rename("app.log.1", "app.log.2");
    rename("app.log", "app.log.1");
    append("c\n");
    EXPECT_EQ(looks(4), "a\nb\nc\n");
}

TEST_F(FileFollowerTest, FollowsAFileWhateverItsNameIfToldTo) {
    m_options.byName = false;
    begin();
    look();
    rename("app.log", "app.log.1");
    append("other\n");
    m_directory.append("app.log.1", "own\n");
    EXPECT_EQ(looks(3), "own\n");
}

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

TEST_F(FileFollowerTest, SkipsTheHoleOfAWriterThatDoesNotAppend) {
    look();
    append("a\n");
    look();
    fs::resize_file(m_path, 0);
    fs::resize_file(m_path, 100'000);
    append("b\n");
    EXPECT_EQ(look(), "b\n");
}

TEST_F(FileFollowerTest, GoesOnInAFileThatReplacesTheLogWithTheSameContents) {
    look();
    append("a\n");
    look();
    m_directory.write("copy", "old\na\nb\n");
    rename("copy", "app.log");
    EXPECT_EQ(looks(2), "b\n");
}

TEST_F(FileFollowerTest, FollowsASymbolicLinkToItsNewTarget) {
    m_directory.write("first", "1\n");
    m_directory.write("second", "2\n");
    fs::remove(m_path);
    fs::create_symlink(file("first"), m_path);
    look();
    m_directory.append("first", "1b\n");
    fs::remove(m_path);
    fs::create_symlink(file("second"), m_path);
    EXPECT_EQ(looks(2), "1b\n2\n");
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

TEST_F(FileFollowerTest, ManyEmptyGenerationsDoNotHideTheFilesAfterThem) {
    look();
    append("a\n");
    rename("app.log", "app.log.41");
    for (int number = 1; number <= 40; ++number) {
        m_directory.write("app.log." + std::to_string(number), "");
    }
    append("b\n");
    restart();
    EXPECT_EQ(looks(3), "a\nb\n");
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

TEST_F(FileFollowerTest, AGenerationThatIsDamagedIsReadAsFarAsItGoes) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    rename("app.log", "app.log.2");
    m_directory.write("app.log.1.gz", "GZb\nc\n\x01");
    append("d\n");
    restart();
    EXPECT_EQ(looks(2), "b\nc\nd\n");
    EXPECT_EQ(m_ledger.losses(), 1);
}

TEST_F(FileFollowerTest, ADirectoryUnderTheNameIsNotAFile) {
    look();
    rename("app.log", "app.log.1");
    fs::create_directory(m_path);
    EXPECT_EQ(look(), "");
    EXPECT_EQ(m_ledger.state(), State::notAFile);
    fs::remove(m_path);
    append("a\n");
    EXPECT_EQ(looks(2), "a\n");
}

TEST_F(FileFollowerTest, AFifoUnderTheNameIsNotOpened) {
    fs::remove(m_path);
    ASSERT_EQ(mkfifo(m_path.c_str(), 0600), 0);
    const Fault fault("open", EIO, {.skip = 0, .times = -1});
    EXPECT_EQ(look(), "");
    EXPECT_EQ(m_ledger.state(), State::notAFile);
    EXPECT_EQ(fault.calls(), 0);
}

TEST_F(FileFollowerTest, TriesAgainToOpenAfterGrowingPauses) {
    const Fault fault("open", EACCES, {.skip = 0, .times = 2});
    EXPECT_EQ(look(), "");
    ASSERT_TRUE(m_ledger.failure());
    EXPECT_STREQ(m_ledger.failure()->call, "open");
    EXPECT_EQ(m_ledger.failure()->number, EACCES);
    EXPECT_EQ(look(), "");
    EXPECT_EQ(fault.failed(), 2);
    EXPECT_EQ(look(), ""); // the second pause is two seconds
    EXPECT_EQ(fault.calls(), 2);
    EXPECT_EQ(look(), "");
    EXPECT_EQ(fault.calls(), 3);
    EXPECT_FALSE(m_ledger.failure());
    append("a\n");
    EXPECT_EQ(look(), "a\n");
}

TEST_F(FileFollowerTest, TriesAgainToRead) {
    look();
    append("a\n");
    {
        const Fault fault("pread", EIO, {.skip = 0, .times = 1});
        EXPECT_EQ(look(), "");
        EXPECT_STREQ(m_ledger.failure()->call, "read");
    }
    EXPECT_EQ(look(), "a\n");
    EXPECT_FALSE(m_ledger.failure());
}

TEST_F(FileFollowerTest, AnInterruptedReadIsNotAFailure) {
    look();
    append("a\n");
    const Fault fault("pread", EINTR, {.skip = 0, .times = 1});
    EXPECT_EQ(look(), "a\n");
    EXPECT_FALSE(m_ledger.failure());
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

TEST_F(FileFollowerTest, TheBeginningOfALongLineIsNotTakenBack) {
    look();
    append(std::string(3000, 'x') + "\n");
    m_now += seconds(1);
    ASSERT_TRUE(m_follower->look({m_now, 0}));
    ASSERT_NE(m_follower->next(), nullptr);
    EXPECT_FALSE(m_follower->takeBack());
}

TEST_F(FileFollowerTest, GivesWholeRecords) {
    m_options.recordLength = 4;
    begin();
    look();
    append("aaaabb");
    EXPECT_EQ(look().substr(0, 4), "aaaa");
    EXPECT_EQ(m_follower->position()->offset, 8);
    append("bb");
    EXPECT_EQ(look().substr(0, 4), "bbbb");
}

TEST_F(FileFollowerTest, KnowsHowMuchIsLeft) {
    look();
    append("a\n");
    m_follower->look({m_now + seconds(1), 0});
    m_follower->noteProgress();
    EXPECT_EQ(m_ledger.behind(), 2);
    look();
    EXPECT_EQ(m_ledger.behind(), 0);
}

} // namespace
