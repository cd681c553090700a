#include "monitor/BackwardBlock.h"

#include "monitor/EntryBlock.h"
#include "monitor/Generation.h"
#include "support/Faults.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <random>
#include <string>
#include <vector>

#include <unistd.h>

using namespace zrm;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class BackwardBlockTest : public testing::Test {
protected:
    /// The entries of a file, the last one first.
    std::vector<std::string> read(std::string_view content, std::size_t recordLength = 0) const {
        const auto file = Generation::open(m_directory.write("log", content));
        BackwardBlock block(recordLength);
        block.start(static_cast<std::int64_t>(content.size()));
        std::vector<std::string> entries;
        while (block.fill(*file) == BackwardBlock::Fill::more) {
            while (const char* const entry = block.next()) {
                entries.emplace_back(recordLength == 0 ? std::string(entry)
                                                       : std::string(entry, recordLength));
            }
        }
        return entries;
    }

    /// The same, read from the beginning and turned round.
    std::vector<std::string> readForward(std::string_view content) const {
        const auto file = Generation::open(m_directory.write("log", content));
        EntryBlock block(0);
        block.start(0, {});
        std::vector<std::string> entries;
        while (block.fill(*file) == EntryBlock::Fill::more) {
            while (const char* const entry = block.next()) {
                entries.emplace_back(entry);
            }
        }
        if (const char* const entry = block.rest()) {
            entries.emplace_back(entry);
        }
        std::reverse(entries.begin(), entries.end());
        return entries;
    }

    TemporaryDirectory m_directory;
};

/// The texts of the entries that a block gives, each with whether it is cut.
template <class Block> std::vector<std::string> textsOf(Block& block, Generation& file) {
    std::vector<std::string> texts;
    while (block.fill(file) == Block::Fill::more) {
        while (block.next() != nullptr) {
            texts.push_back(std::string(block.text()) + (block.isTextCut() ? "..." : ""));
        }
    }
    return texts;
}

TEST_F(BackwardBlockTest, TheTextsAreThoseOfEntryBlock) {
    std::mt19937 random(7);
    std::string content;
    for (int line = 0; line < 60; ++line) {
        const std::size_t lengths[] = {3, 2047, 65'535, 65'536, 65'537, 100'000, 700'000};
        content += std::to_string(line) + std::string(lengths[random() % 7], 'x');
        content += random() % 2 == 0 ? "\r\n" : "\n";
    }
    const std::string path = m_directory.write("log", content);
    BackwardBlock backward(0);
    backward.start(static_cast<std::int64_t>(content.size()));
    std::vector<std::string> texts = textsOf(backward, *Generation::open(path));
    std::reverse(texts.begin(), texts.end());
    EntryBlock forward(0);
    forward.start(0, {});
    const std::vector<std::string> expected = textsOf(forward, *Generation::open(path));
    ASSERT_EQ(texts.size(), 60u);
    for (std::size_t line = 0; line < texts.size(); ++line) {
        EXPECT_TRUE(texts[line] == expected[line])
            << line << ": " << texts[line].size() << " and " << expected[line].size() << " bytes";
    }
}

TEST_F(BackwardBlockTest, GivesTheLastLineFirst) {
    EXPECT_THAT(read("one\ntwo\n\nthree\n"), ElementsAre("three\n", "\n", "two\n", "one\n"));
    EXPECT_THAT(read(""), IsEmpty());
    EXPECT_THAT(read("\n"), ElementsAre("\n"));
}

TEST_F(BackwardBlockTest, AnUnfinishedLastLineIsAnEntry) {
    EXPECT_THAT(read("one\ntw"), ElementsAre("tw\n", "one\n"));
}

TEST_F(BackwardBlockTest, ZerosBeforeALineAreNotPartOfIt) {
    using namespace std::string_literals;
    EXPECT_THAT(read("one\n\0\0\0two\n"s), ElementsAre("two\n", "one\n"));
    EXPECT_THAT(read("\0\0one\ntwo\n\0\0"s), ElementsAre("two\n", "one\n"));
    const std::string hole(1'000'000, '\0');
    EXPECT_THAT(read("one\n" + hole + "two\n"), ElementsAre("two\n", "one\n"));
    EXPECT_THAT(read(hole), IsEmpty());
}

TEST_F(BackwardBlockTest, GivesTheBeginningOfALongLine) {
    const std::string beginning = std::string(2045, 'a') + 'b';
    for (const std::size_t more : {1U, 2000U, 262'000U, 262'144U, 3'000'000U}) {
        const std::string text = "one\n" + beginning + std::string(more, 'c');
        EXPECT_THAT(read(text + "\ntwo\n"), ElementsAre("two\n", beginning + "\n", "one\n"))
            << more;
        EXPECT_THAT(read(text), ElementsAre(beginning + "\n", "one\n")) << more;
    }
    EXPECT_THAT(read("one\n" + beginning + "\n"), ElementsAre(beginning + "\n", "one\n"));
}

TEST_F(BackwardBlockTest, GivesTheEntriesThatReadingForwardGives) {
    std::mt19937 random(20061005);
    for (int round = 0; round < 30; ++round) {
        std::string content;
        while (content.size() < 900'000) {
            const auto kind = random() % 100;
            const std::size_t length = kind < 90   ? random() % 300
                                       : kind < 98 ? 1900 + random() % 300
                                                   : random() % 400'000;
            content.append(kind == 50 ? random() % 5 : 0, '\0');
            content.append(length, static_cast<char>('a' + random() % 26));
            content += '\n';
        }
        content.append(round % 3 == 0 ? 0 : random() % 5000, 'z');
        EXPECT_EQ(read(content), readForward(content)) << "round " << round;
    }
}

TEST_F(BackwardBlockTest, GivesWholeRecords) {
    EXPECT_THAT(read("11112222333", 4), ElementsAre("2222", "1111"));
    std::string content;
    std::vector<std::string> records;
    for (int number = 0; number < 20'000; ++number) {
        char record[41];
        std::snprintf(record, sizeof record, "%040d", number);
        content += record;
        records.emplace_back(record);
    }
    std::reverse(records.begin(), records.end());
    EXPECT_EQ(read(content, 40), records);
}

TEST_F(BackwardBlockTest, NoticesThatTheFileIsShorter) {
    const std::string path = m_directory.write("log", "one\ntwo\n");
    const auto file = Generation::open(path);
    BackwardBlock block(0);
    block.start(8);
    ASSERT_EQ(truncate(path.c_str(), 5), 0);
    EXPECT_EQ(block.fill(*file), BackwardBlock::Fill::changed);
    EXPECT_EQ(block.next(), nullptr);
}

TEST_F(BackwardBlockTest, SaysThatReadingFailed) {
    const auto file = Generation::open(m_directory.write("log", "one\n"));
    BackwardBlock block(0);
    block.start(4);
    const Fault fault("pread", EIO);
    EXPECT_EQ(block.fill(*file), BackwardBlock::Fill::failed);
    EXPECT_EQ(errno, EIO);
}

} // namespace
