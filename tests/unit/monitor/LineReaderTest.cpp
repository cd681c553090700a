#include "monitor/LineReader.h"

#include "support/Faults.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <cerrno>
#include <cstdio>
#include <memory>
#include <random>
#include <string>
#include <vector>

#include <fcntl.h>
#include <unistd.h>

using namespace zrm;

namespace {

constexpr std::size_t blockSize = 256 * 1024;

using Pieces = std::vector<std::string>;

class LineReaderTest : public testing::Test {
protected:
    /// The pieces up to the end of the input, as C strings.
    Pieces piecesOf(const std::string& content) {
        const std::string path = m_directory.write("lines", content);
        const int fd = open(path.c_str(), O_RDONLY);
        Pieces pieces;
        m_reader.start(fd);
        while (const char* const piece = m_reader.next()) {
            pieces.emplace_back(piece);
        }
        EXPECT_EQ(m_reader.error(), 0);
        EXPECT_EQ(lseek(fd, 0, SEEK_CUR), static_cast<off_t>(content.size()));
        close(fd);
        return pieces;
    }

    /// The same, read by fgets with a buffer of 2048 bytes.
    Pieces piecesByFgets(const std::string& content) {
        const std::string path = m_directory.write("lines", content);
        const std::unique_ptr<std::FILE, int (*)(std::FILE*)> stream(std::fopen(path.c_str(), "r"),
                                                                     std::fclose);
        Pieces pieces;
        char line[2048];
        while (std::fgets(line, sizeof line, stream.get()) != nullptr) {
            pieces.emplace_back(line);
        }
        return pieces;
    }

    TemporaryDirectory m_directory;
    LineReader m_reader;
};

TEST_F(LineReaderTest, AnEmptyFileHasNoPieces) {
    EXPECT_EQ(piecesOf(""), Pieces{});
}

TEST_F(LineReaderTest, KeepsNewlinesAndALastLineWithoutOne) {
    EXPECT_EQ(piecesOf("one\n\ntwo\nthree"), (Pieces{"one\n", "\n", "two\n", "three"}));
}

TEST_F(LineReaderTest, ALongLineComesInPieces) {
    const std::string line(5000, 'x');
    EXPECT_EQ(piecesOf(line + "\nnext\n"), (Pieces{line.substr(0, 2047), line.substr(0, 2047),
                                                   line.substr(0, 906) + "\n", "next\n"}));
}

TEST_F(LineReaderTest, ALineEndsForItsReaderAtItsFirstNulByte) {
    EXPECT_EQ(piecesOf(std::string("a\0b\nc\n", 6)), (Pieces{"a", "c\n"}));
}

TEST_F(LineReaderTest, APieceMayBeChanged) {
    const std::string path = m_directory.write("lines", "one\ntwo\n");
    const int fd = open(path.c_str(), O_RDONLY);
    m_reader.start(fd);
    char* const piece = m_reader.next();
    std::fill_n(piece, 4, '\0');
    EXPECT_STREQ(m_reader.next(), "two\n");
    close(fd);
}

TEST_F(LineReaderTest, PiecesAroundTheBlockAndTheLineBufferAreThoseOfFgets) {
    for (const std::size_t length : {2045UL, 2046UL, 2047UL, 2048UL, 4093UL, 4094UL, 4095UL}) {
        for (const char* end : {"", "\n", "\nx", "\n\n"}) {
            const std::string content = std::string(length, 'l') + end;
            EXPECT_EQ(piecesOf(content), piecesByFgets(content)) << length << '+' << end;
        }
    }
    for (const std::size_t before :
         {blockSize - 2048, blockSize - 2047, blockSize - 2, blockSize - 1, blockSize,
          blockSize + 1, 2 * blockSize - 1, 3 * blockSize}) {
        const std::string content =
            std::string(before - 1, 'b') + "\n" + std::string(3000, 'l') + "\n.";
        EXPECT_EQ(piecesOf(content), piecesByFgets(content)) << before;
    }
}

TEST_F(LineReaderTest, RandomContentIsCutIntoThePiecesOfFgets) {
    const unsigned seed = std::random_device{}();
    SCOPED_TRACE("seed " + std::to_string(seed));
    std::mt19937 random(seed);
    for (int round = 0; round < 30; ++round) {
        std::string content;
        const std::size_t size = random() % (3 * blockSize);
        const unsigned longest = round % 3 == 0 ? 10 : 5000;
        while (content.size() < size) {
            content.append(random() % longest, static_cast<char>(random() % 256));
            content += random() % 50 == 0 ? '\0' : '\n';
        }
        ASSERT_EQ(piecesOf(content), piecesByFgets(content)) << "round " << round;
    }
}

TEST_F(LineReaderTest, StartingAgainReadsWhatWasAppended) {
    const std::string path = m_directory.write("lines", "one\ntw");
    const int fd = open(path.c_str(), O_RDONLY);
    m_reader.start(fd);
    EXPECT_STREQ(m_reader.next(), "one\n");
    EXPECT_STREQ(m_reader.next(), "tw");
    EXPECT_EQ(m_reader.next(), nullptr);
    m_directory.append("lines", "o\nthree\n");
    EXPECT_EQ(m_reader.next(), nullptr); // the end of input was reached
    m_reader.start(fd);
    EXPECT_STREQ(m_reader.next(), "o\n");
    EXPECT_STREQ(m_reader.next(), "three\n");
    EXPECT_EQ(m_reader.next(), nullptr);
    m_reader.release();
    m_reader.start(fd);
    EXPECT_EQ(m_reader.next(), nullptr);
    close(fd);
}

TEST_F(LineReaderTest, AFailedReadEndsTheInputAndDropsTheUnfinishedLine) {
    const std::string path = m_directory.write("lines", "one\ntw");
    const int fd = open(path.c_str(), O_RDONLY);
    m_reader.start(fd);
    const Fault fault("read", EIO, {.skip = 1});
    EXPECT_STREQ(m_reader.next(), "one\n");
    EXPECT_EQ(m_reader.next(), nullptr);
    EXPECT_EQ(m_reader.error(), EIO);
    EXPECT_EQ(m_reader.next(), nullptr);
    EXPECT_EQ(m_reader.error(), EIO);
    close(fd);
}

TEST_F(LineReaderTest, MissingMemoryCountsAsAFailedRead) {
    const std::string path = m_directory.write("lines", "one\n");
    const int fd = open(path.c_str(), O_RDONLY);
    {
        const Fault fault("new", ENOMEM);
        m_reader.start(fd);
        EXPECT_EQ(m_reader.next(), nullptr);
        EXPECT_EQ(m_reader.error(), ENOMEM);
    }
    m_reader.start(fd);
    EXPECT_STREQ(m_reader.next(), "one\n");
    close(fd);
}

} // namespace
