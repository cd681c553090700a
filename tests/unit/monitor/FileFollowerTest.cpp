// Which file is read, and from where.
#include "FileFollowerTest.h"

namespace {

TEST_F(FileFollowerTest, BeginsAtTheEndOfAFileThatIsThere) {
    EXPECT_EQ(look(), "");
    append("a\nb\n");
    EXPECT_EQ(look(), "a\nb\n");
    EXPECT_EQ(m_ledger.position(), 8);
    EXPECT_EQ(m_ledger.state(), State::reading);
}

TEST_F(FileFollowerTest, WhatWasBesideAnEmptyLogAtTheFirstStartIsOlder) {
    age(m_path, 50);
    fs::resize_file(m_path, 0);
    age(m_path, 50);
    age(file("app.log.1"), 20, "before the first start\n");
    EXPECT_EQ(looks(2), "");
    m_directory.append("app.log.1", "by a writer that still has it\n");
    append("a\n");
    EXPECT_EQ(looks(2), "a\n");
}

TEST_F(FileFollowerTest, RecoversWhatWasTruncatedInALogThatWasEmptyAtTheFirstStart) {
    fs::resize_file(m_path, 0);
    age(m_path, 50);
    age(file("app.log.1"), 20, "before the first start\n");
    EXPECT_EQ(look(), "");
    rename("app.log.1", "app.log.2");
    append("a\n");
    copyAndTruncate("app.log.1");
    append("b\n");
    EXPECT_EQ(looks(3), "a\nb\n");
}

TEST_F(FileFollowerTest, RecoversFromACopyWithTheInodeOfAFileThatWasThereAtTheFirstStart) {
    for (const bool isCompressed : {false, true}) {
        const std::string older = isCompressed ? "app.log.1.gz" : "app.log.1";
        fs::resize_file(m_path, 0);
        age(m_path, 50);
        m_directory.write(older, isCompressed ? "GZ" : "");
        age(file(older), 60);
        begin();
        EXPECT_EQ(look(), "");
        rename(older, "app.log.2");
        m_directory.write("app.log.2", "a\n");
        append("b\n");
        EXPECT_EQ(looks(3), "a\nb\n") << older;
        fs::remove(file("app.log.2"));
    }
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

TEST_F(FileFollowerTest, SkipsTheHoleOfAWriterThatDoesNotAppend) {
    look();
    append("a\n");
    look();
    fs::resize_file(m_path, 0);
    fs::resize_file(m_path, 100'000);
    append("b\n");
    EXPECT_EQ(look(), "b\n");
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

TEST_F(FileFollowerTest, TheNameOfAFileThatDoesNotChangeIsLookedAtEveryFifthTime) {
    looks(3);
    const Fault names("lstat", EIO, {.skip = 100});
    for (int second = 0; second < 4; ++second) {
        look();
    }
    EXPECT_EQ(names.calls(), 0);
    look();
    EXPECT_EQ(names.calls(), 1);
    EXPECT_EQ(m_ledger.state(), State::reading);
}

TEST_F(FileFollowerTest, AQuietFileThatIsRenamedIsNoticedAtOnce) {
    looks(3);
    waitForTick();
    rename("app.log", "app.log.1");
    look();
    EXPECT_EQ(m_ledger.state(), State::missing);
    append("new\n");
    look();
    EXPECT_EQ(m_ledger.state(), State::finishing);
    EXPECT_EQ(look(seconds(3)), "new\n");
}

TEST_F(FileFollowerTest, AQuietFileThatIsRemovedIsNoticedAtOnce) {
    looks(3);
    waitForTick();
    fs::remove(m_path);
    look();
    EXPECT_EQ(m_ledger.state(), State::missing);
}

TEST_F(FileFollowerTest, ALinkToAQuietFileIsLookedAtEverySecond) {
    m_directory.write("first", "1\n");
    m_directory.write("second", "2\n");
    fs::remove(m_path);
    fs::create_symlink(file("first"), m_path);
    looks(3);
    fs::remove(m_path);
    fs::create_symlink(file("second"), m_path);
    look();
    EXPECT_EQ(m_ledger.state(), State::finishing);
    EXPECT_EQ(look(seconds(3)), "2\n");
}

TEST_F(FileFollowerTest, EveryLookAtAQuietFileIsLeftOut) {
    append("a\n");
    looks(3);
    ASSERT_TRUE(m_follower->isQuiet());
    const Fault names("lstat", EIO, {.times = 0});
    for (int i = 0; i < 20; ++i) {
        EXPECT_TRUE(m_follower->isQuiet());
    }
    EXPECT_EQ(names.calls(), 4);
    append("b\n");
    EXPECT_EQ(look(), "b\n");
}

TEST_F(FileFollowerTest, AnExchangedDirectoryOfAQuietFileIsNoticedWithinFiveLooks) {
    fs::create_directory(file("first"));
    fs::create_directory(file("second"));
    m_directory.write("first/log", "1\n");
    m_directory.write("second/log", "2\n");
    fs::create_symlink(file("first"), file("current"));
    m_path = file("current/log");
    begin();
    looks(3);
    fs::remove(file("current"));
    fs::create_symlink(file("second"), file("current"));
    EXPECT_EQ(looks(6), "2\n");
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

TEST_F(FileFollowerTest, ReadsAnEmptyGenerationThatIsWrittenLaterThanTheOneAfterIt) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    rename("app.log", "app.log-20260001");
    m_directory.write("app.log-20260002", ""); // the writer has it
    m_directory.write("app.log", "");
    restart();
    EXPECT_EQ(look(), "");
    rename("app.log", "app.log-20260003");
    age(file("app.log-20260003"), 30);
    age(file("app.log-20260002"), 20, "b\n");
    m_directory.write("app.log-20260004", "c\n");
    append("d\n");
    EXPECT_EQ(looks(5), "b\nc\nd\n");
    EXPECT_EQ(m_ledger.losses(), 0);
}

TEST_F(FileFollowerTest, ReadsAFileBeforeTheGenerationsAfterItWhileNoneHasTheName) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    rename("app.log", "app.log-20260001");
    m_directory.write("app.log", "");
    EXPECT_EQ(looks(3), "");
    append("b\n");
    rename("app.log", "app.log-20260002");
    m_directory.write("app.log-20260003", "c\n");
    EXPECT_EQ(look(), "b\n");
    append("d\n");
    EXPECT_EQ(looks(4), "c\nd\n");
    EXPECT_EQ(m_ledger.losses(), 0);
}

TEST_F(FileFollowerTest, AGenerationThatIsDamagedIsPassedOver) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    rename("app.log", "app.log.2");
    m_directory.write("app.log.1.gz", "GZb\nc\n\x01");
    append("d\n");
    restart();
    EXPECT_EQ(looks(2), "d\n");
    EXPECT_EQ(looks(3), "");
    EXPECT_EQ(m_ledger.losses(), 1);
    EXPECT_EQ(m_ledger.lostBytes(), 0); // the length of compressed contents is not known
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

TEST_F(FileFollowerTest, PausesInAFileThatGivesNoEntries) {
    look();
    fs::resize_file(m_path, 100'000'000);
    append("a\n");
    m_now += seconds(1);
    ASSERT_TRUE(m_follower->look({m_now, 0}));
    EXPECT_EQ(m_follower->next(), nullptr);
    EXPECT_TRUE(m_follower->isPaused());
    EXPECT_LT(m_follower->takeBytesRead(), 20'000'000);
    const char* entry = nullptr;
    while (entry == nullptr && m_follower->isPaused()) {
        entry = m_follower->next();
    }
    EXPECT_STREQ(entry, "a\n");
    EXPECT_FALSE(m_follower->isPaused());
    EXPECT_EQ(m_follower->next(), nullptr);
    EXPECT_FALSE(m_follower->isPaused());
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

TEST_F(FileFollowerTest, ReadsNothingOfADamagedCompressedFile) {
    look();
    append("a\n");
    EXPECT_EQ(look(), "a\n");
    m_directory.write("app.log.1.gz", "GZold\na\nb\nwrong\n\x01");
    fs::resize_file(m_path, 0);
    append("c\n");
    EXPECT_EQ(looks(4), "c\n");
    ASSERT_EQ(m_ledger.lost().size(), 1U);
    EXPECT_EQ(m_ledger.lost()[0].source, file("app.log.1.gz"));
    EXPECT_EQ(m_ledger.lost()[0].from, 6);
}

} // namespace
