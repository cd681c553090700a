#include "logtypes/ErrLogFile.h"

#include "ErrLogTest.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstring>

using namespace zrm;

namespace {

class ErrLogFileLineTest : public ErrLogTest {
protected:
    /// Formats a line and returns the result of formatEntryAsRow.
    long format(const std::string& text) {
        // A copy of the exact size, so that a sanitizer detects a read past the text.
        const auto copy = std::make_unique<char[]>(text.size() + 1);
        std::memcpy(copy.get(), text.c_str(), text.size() + 1);
        return m_monitor->formatEntryAsRow(copy.get(), &row, nullptr);
    }
    static std::string padded(std::string text, std::size_t width) {
        text.resize(width, ' ');
        return text;
    }
    template <std::size_t width> static std::string whole(const char (&column)[width]) {
        return {column, width};
    }
    /// The time stamp of a line with this time, or "none".
    static std::string time(const std::string& text) {
        char stamp[16];
        const std::string line = "A924A5FC   " + text + " P S SYSPROC X\n";
        return ErrLogFile::formatEntryTime(stamp, line.c_str()) != nullptr ? whole(stamp) : "none";
    }

    zrm_rmlogent_data_t row;

private:
    const std::unique_ptr<ErrLogFile> m_monitor = start("exit");
};

TEST_F(ErrLogFileLineTest, FillsEveryColumnOfTheRow) {
    ASSERT_EQ(format(entry), 0);
    const std::string directoryName = directory.path().string() + "/";
    const std::string description = "A924A5FC: SOFTWARE PROGRAM ABNORMALLY TERMINATED";
    EXPECT_EQ(whole(row.originnode), padded("web1:ZRM", 64));
    EXPECT_EQ(whole(row.logpath), padded(directoryName, 256));
    EXPECT_EQ(whole(row.logname), padded("errlog", 128));
    EXPECT_EQ(whole(row.entrytime), "1061004030300000");
    EXPECT_EQ(whole(row.entrysys), padded("web1.example.org", 32));
    EXPECT_EQ(whole(row.entrysrc), padded("SYSPROC", 32));
    EXPECT_EQ(whole(row.entrytype), padded("P", 16));
    EXPECT_EQ(whole(row.entryclass), padded("S", 16));
    EXPECT_EQ(whole(row.entrydesc), padded(description, 256));
    EXPECT_EQ(row.freqthresh, 0);
    EXPECT_EQ(row.periodthrs, 0);
    EXPECT_EQ(whole(row.ulogpath), padded(directoryName, 768));
    EXPECT_EQ(whole(row.ulogname), padded("errlog", 384));
    EXPECT_EQ(whole(row.uentrysrc), padded("SYSPROC", 96));
    EXPECT_EQ(whole(row.uentrydesc), padded(description, 768));
}

TEST_F(ErrLogFileLineTest, ConvertsSourceAndDescriptionToUtf8) {
    ASSERT_EQ(format("A924A5FC   1004030306 P S f\xFCnf Gr\xFC\xDF"
                     "e\n"),
              0);
    EXPECT_EQ(whole(row.entrysrc), padded("f\xFCnf", 32));
    EXPECT_EQ(whole(row.uentrysrc), padded("f\xC3\xBCnf", 96));
    EXPECT_EQ(whole(row.entrydesc), padded("A924A5FC: Gr\xFC\xDF"
                                           "e",
                                           256));
    EXPECT_EQ(whole(row.uentrydesc), padded("A924A5FC: Gr\xC3\xBC\xC3\x9F"
                                            "e",
                                            768));
}

TEST_F(ErrLogFileLineTest, CutsALongHostName) {
    static char longName[] = "a-host-name-of-more-than-32-characters.example.org";
    gHostName = longName;
    ASSERT_EQ(format(entry), 0);
    EXPECT_EQ(whole(row.entrysys), "a-host-name-of-more-than-32-char");
}

TEST_F(ErrLogFileLineTest, RefusesLinesWithoutATime) {
    EXPECT_NE(format(header), 0);
    EXPECT_NE(format(""), 0);
    EXPECT_NE(format("\n"), 0);
    EXPECT_NE(format("A924A5FC   100403030"), 0);
    EXPECT_NE(format("A924A5FC   100403030\n"), 0);
    EXPECT_NE(format("A924A5FC   10040303x6 P S SYSPROC text\n"), 0);
    EXPECT_NE(format(std::string("A924A5FC\0  1004030306 P S SYSPROC text\n", 40)), 0);
    EXPECT_EQ(whole(row.originnode), padded("", 64));
}

TEST_F(ErrLogFileLineTest, TakesTheCenturyFromTheYear) {
    EXPECT_EQ(time("1004030306"), "1061004030300000");
    EXPECT_EQ(time("1231235969"), "1691231235900000");
    EXPECT_EQ(time("0101000070"), "0700101000000000");
    EXPECT_EQ(time("1231235999"), "0991231235900000");
    EXPECT_EQ(time("0101000000"), "1000101000000000");
    EXPECT_EQ(time("9999999999"), "0999999999900000");
    EXPECT_EQ(time("10040303-6"), "none");
}

TEST_F(ErrLogFileLineTest, ContinuesAfterTheCharacterThatFollowsTheTime) {
    char stamp[16];
    const char* const line = "A924A5FC   1004030306xP S";
    EXPECT_STREQ(ErrLogFile::formatEntryTime(stamp, line), "P S");
    const char* const bare = "A924A5FC   1004030306";
    EXPECT_STREQ(ErrLogFile::formatEntryTime(stamp, bare), "");
}

TEST_F(ErrLogFileLineTest, AcceptsLinesThatEndEarly) {
    ASSERT_EQ(format("A924A5FC   1004030306"), 0);
    EXPECT_EQ(columnText(row.entrytype), "");
    EXPECT_EQ(columnText(row.entrydesc), "A924A5FC:");
    ASSERT_EQ(format("A924A5FC   1004030306 P\n"), 0);
    EXPECT_EQ(columnText(row.entrytype), "P");
    EXPECT_EQ(columnText(row.entryclass), "");
    EXPECT_EQ(columnText(row.entrysrc), "");
    EXPECT_EQ(columnText(row.entrydesc), "A924A5FC:");
    ASSERT_EQ(format("A924A5FC   1004030306 P S SYSPROC"), 0);
    EXPECT_EQ(columnText(row.entrysrc), "SYSPROC");
    EXPECT_EQ(columnText(row.entrydesc), "A924A5FC:");
    ASSERT_EQ(format("A924A5FC   1004030306 P S SYSPROC x"), 0);
    EXPECT_EQ(columnText(row.entrydesc), "A924A5FC:");
}

TEST_F(ErrLogFileLineTest, ALineOf255CharactersLosesItsLastOneLikeAnyOther) {
    std::string text = "A924A5FC   1004030306 P S SYSPROC ";
    text.resize(255, 'd');
    text.back() = 'e';
    ASSERT_EQ(format(text), 0);
    EXPECT_EQ(columnText(row.entrydesc), "A924A5FC: " + std::string(255 - 34 - 1, 'd'));
}

TEST_F(ErrLogFileLineTest, FieldsAreSeparatedByAnyWhiteSpace) {
    ASSERT_EQ(format("A924A5FC   1004030306 P\t\tS \v\f SYSPROC\r more\n"), 0);
    EXPECT_EQ(columnText(row.entrytype), "P");
    EXPECT_EQ(columnText(row.entryclass), "S");
    EXPECT_EQ(columnText(row.entrysrc), "SYSPROC");
    EXPECT_EQ(columnText(row.entrydesc), "A924A5FC: more");
}

TEST_F(ErrLogFileLineTest, AFieldLosesTheCharacterAfterItsMaximumAndRunsOn) {
    char space[16];
    std::memset(space, '.', sizeof space);
    const char* const text = "abcdefgh  next";
    EXPECT_STREQ(ErrLogFile::extractNextField(space, text, 4, space + sizeof space), "next");
    EXPECT_EQ(whole(space), "abcdfgh.........");
    std::memset(space, '.', sizeof space);
    ErrLogFile::extractNextField(space, text, 7, space + sizeof space);
    EXPECT_EQ(whole(space), "abcdefg.........");
    std::memset(space, '.', sizeof space);
    ErrLogFile::extractNextField(space, text, 8, space + sizeof space);
    EXPECT_EQ(whole(space), "abcdefgh........");
    // Nothing is written at or past the end.
    std::memset(space, '.', sizeof space);
    EXPECT_STREQ(ErrLogFile::extractNextField(space, text, 4, space + 6), "next");
    EXPECT_EQ(whole(space), "abcdfg..........");
}

TEST_F(ErrLogFileLineTest, LongFieldsRunIntoTheFollowingColumns) {
    // 40 characters: 32 fill the source, one is lost, 7 run into the type, which was set before.
    const std::string source = std::string(32, 's') + "-" + std::string(7, 'o');
    ASSERT_EQ(format("A924A5FC   1004030306 PERM HARD " + source + " text\n"), 0);
    EXPECT_EQ(whole(row.entrysrc), std::string(32, 's'));
    EXPECT_EQ(columnText(row.entrytype), "ooooooo");
    EXPECT_EQ(columnText(row.entryclass), "HARD");
    EXPECT_EQ(columnText(row.uentrysrc), std::string(32, 's'));
    EXPECT_EQ(columnText(row.entrydesc), "A924A5FC: text");
}

TEST_F(ErrLogFileLineTest, AFieldNeverRunsPastTheRow) {
    struct {
        zrm_rmlogent_data_t row;
        char guard[4096];
    } memory;
    std::memset(memory.guard, '#', sizeof memory.guard);
    std::string text = "A924A5FC   1004030306 " + std::string(6000, 't') + " c s d\n";
    ASSERT_EQ(start("exit")->formatEntryAsRow(text.data(), &memory.row, nullptr), 0);
    EXPECT_EQ(std::string(memory.guard, sizeof memory.guard), std::string(4096, '#'));
    text = "A924A5FC   1004030306 t c s " + std::string(6000, 'd') + "\n";
    ASSERT_EQ(start("exit")->formatEntryAsRow(text.data(), &memory.row, nullptr), 0);
    EXPECT_EQ(std::string(memory.guard, sizeof memory.guard), std::string(4096, '#'));
    EXPECT_EQ(whole(memory.row.entrydesc), "A924A5FC: " + std::string(246, 'd'));
    EXPECT_EQ(whole(memory.row.uentrydesc), "A924A5FC: " + std::string(758, 'd'));
}

TEST_F(ErrLogFileLineTest, ADescriptionIsCutToItsRoom) {
    const auto described = [](unsigned long size, int toUtf8) {
        char column[24];
        std::memset(column, '.', sizeof column);
        ErrLogFile::formatDescription(column, "A924A5FC   1004030306 x", "rest\n", size, toUtf8);
        return whole(column);
    };
    EXPECT_EQ(described(24, 0), "A924A5FC: rest..........");
    EXPECT_EQ(described(24, 1), "A924A5FC: rest..........");
    EXPECT_EQ(described(12, 0), "A924A5FC: re............");
    EXPECT_EQ(described(12, 1), "A924A5FC: re............");
    EXPECT_EQ(described(9, 0), "A924A5FC:...............");
    EXPECT_EQ(described(5, 0), "A924A...................");
    EXPECT_EQ(described(0, 0), "........................");
}

} // namespace
