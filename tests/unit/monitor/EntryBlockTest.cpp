#include "monitor/EntryBlock.h"

#include "framework/LogEntry.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <fstream>
#include <memory>
#include <string>
#include <vector>

using namespace zrm;
using namespace std::string_literals;

namespace {

constexpr std::size_t longest = EntryKeep::longestText;

/// An entry as it is judged and as its text has it.
struct Seen {
    std::string judged; ///< up to a NUL, without its newline
    std::string text;
    bool isCut = false;
};

class EntryBlockTest : public testing::Test {
protected:
    /// Every entry of a file with this content, and what is left at its end.
    std::vector<Seen> entriesOf(const std::string& content, std::size_t recordLength = 0) {
        const auto file = Generation::open(m_directory.write("log", content));
        EntryBlock block(recordLength);
        block.start(0, {});
        std::vector<Seen> seen;
        do {
            while (const char* const entry = block.next()) {
                seen.push_back(see(entry, block));
            }
        } while (block.fill(*file) == EntryBlock::Fill::more);
        if (const char* const entry = block.rest()) {
            seen.push_back(see(entry, block));
        }
        return seen;
    }
    static Seen see(const char* entry, const EntryBlock& block) {
        std::string judged(entry);
        if (judged.ends_with('\n')) {
            judged.pop_back();
        }
        return {judged, std::string(block.text()), block.isTextCut()};
    }

    TemporaryDirectory m_directory;
};

TEST_F(EntryBlockTest, TheTextIsTheWholeLine) {
    const auto seen = entriesOf("one\ntwo\r\n\nlast");
    ASSERT_EQ(seen.size(), 4u);
    EXPECT_EQ(seen[0].text, "one");
    EXPECT_EQ(seen[1].text, "two") << "without the line end";
    EXPECT_EQ(seen[2].text, "");
    EXPECT_EQ(seen[3].text, "last");
    EXPECT_FALSE(seen[0].isCut);
}

TEST_F(EntryBlockTest, TheTextOfALongLineIsWholeWhereOnlyItsBeginningIsJudged) {
    for (const std::size_t length : {std::size_t{2047}, std::size_t{60'000}, longest}) {
        const std::string line = std::string(length - 1, 'x') + "y";
        const auto seen = entriesOf("before\n" + line + "\nafter\n");
        ASSERT_EQ(seen.size(), 3u) << length;
        EXPECT_EQ(seen[1].judged, line.substr(0, 2046)) << length;
        EXPECT_EQ(seen[1].text, line) << length;
        EXPECT_FALSE(seen[1].isCut) << length;
        EXPECT_EQ(seen[2].text, "after") << length;
    }
}

TEST_F(EntryBlockTest, TheTextOfALongerLineIsItsBeginning) {
    // In one block, over two of them, and over many.
    for (const std::size_t length : {longest + 1, std::size_t{200'000}, std::size_t{3'000'000}}) {
        const std::string line = "begin" + std::string(length - 5, 'x');
        const auto seen = entriesOf("before\n" + line + "\nafter\n" + line);
        ASSERT_EQ(seen.size(), 4u) << length;
        for (const std::size_t entry : {std::size_t{1}, std::size_t{3}}) {
            EXPECT_EQ(seen[entry].text, line.substr(0, longest)) << length;
            EXPECT_EQ(seen[entry].judged, line.substr(0, 2046)) << length;
            EXPECT_TRUE(seen[entry].isCut) << length;
        }
        EXPECT_FALSE(seen[2].isCut);
    }
}

TEST_F(EntryBlockTest, LinesAcrossBlocksAreWhole) {
    std::string content;
    std::vector<std::string> lines;
    for (std::size_t number = 0; number < 40; ++number) {
        lines.push_back(std::to_string(number) + std::string(number * 1500, 'z'));
        content += lines.back() + '\n';
    }
    const auto seen = entriesOf(content);
    ASSERT_EQ(seen.size(), lines.size());
    for (std::size_t number = 0; number < lines.size(); ++number) {
        EXPECT_EQ(seen[number].text, lines[number]) << number;
    }
}

TEST_F(EntryBlockTest, BytesThatAreNotTextStayInTheText) {
    const auto seen = entriesOf("\0\0a\0b\xff\n"s);
    ASSERT_EQ(seen.size(), 1u);
    EXPECT_EQ(seen[0].judged, "a");
    EXPECT_EQ(seen[0].text, "a\0b\xff"s);
}

TEST_F(EntryBlockTest, ARecordIsItsOwnText) {
    const auto seen = entriesOf("record 1record 2", 8);
    ASSERT_EQ(seen.size(), 2u);
    EXPECT_EQ(seen[0].text, "record 1");
    EXPECT_FALSE(seen[0].isCut);
}

} // namespace
