#include "TestJoin.h"
#include "framework/LogEntry.h"
#include "monitor/BackwardBlock.h"
#include "monitor/EntryBlock.h"
#include "monitor/Generation.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <array>
#include <functional>
#include <random>
#include <string>
#include <vector>

using namespace zrm;
using namespace std::string_literals;

// Entries of several lines, read forwards and backwards, and what a plain model makes of the lines.

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::size_t longestText = EntryKeep::longestText;
constexpr std::size_t longestLine = 2046;

/// An entry: what a kind of log judges, its text, and whether that is cut.
std::string shown(std::string_view judged, std::string_view text, bool isCut) {
    return std::string(judged) + "|" + std::string(text) + (isCut ? "..." : "");
}

template <class Block> std::string shownLast(const char* entry, const Block& block) {
    std::string_view judged(entry);
    EXPECT_TRUE(judged.ends_with('\n'));
    judged.remove_suffix(1);
    return shown(judged, block.text(), block.isTextCut());
}

void giveAll(EntryBlock& block, std::vector<std::string>& entries) {
    while (const char* const entry = block.next()) {
        entries.push_back(shownLast(entry, block));
    }
}

void giveRest(EntryBlock& block, std::vector<std::string>& entries) {
    while (const char* const entry = block.rest()) {
        entries.push_back(shownLast(entry, block));
    }
}

/// What the entries of a content are by definition.
std::vector<std::string> modelOf(std::string_view content, const LineJoin& join) {
    const LineJoin::Limits& limits = join.limits();
    std::vector<std::string> entries;
    std::string text;
    std::string judged;
    std::string_view before;
    std::size_t lines = 0;
    const auto end = [&] {
        if (lines > 0) {
            const bool isCut = text.size() > longestText;
            text.resize(std::min(text.size(), longestText));
            if (!isCut && text.ends_with('\r')) {
                text.pop_back();
            }
            entries.push_back(shown(judged, text, isCut));
        }
        lines = 0;
    };
    while (!content.empty()) {
        const std::size_t newline = content.find('\n');
        std::string_view line = content.substr(0, newline);
        content.remove_prefix(newline == std::string_view::npos ? content.size() : newline + 1);
        const bool isJoined = lines > 0 && lines < limits.lines &&
                              text.size() + 1 + line.size() + 1 <= limits.bytes &&
                              join.joins(before, line);
        if (isJoined) {
            text += '\n';
            text += line;
        } else {
            end();
            line.remove_prefix(std::min(line.find_first_not_of('\0'), line.size()));
            if (line.empty() && newline == std::string_view::npos) {
                break;
            }
            text = line;
            judged = line.substr(0, longestLine);
        }
        ++lines;
        before = line;
    }
    end();
    return entries;
}

class JoinedEntries : public testing::Test {
protected:
    std::vector<std::string> forwards(std::string_view content, const LineJoin& join) {
        const auto file = Generation::open(m_directory.write("log", content));
        EntryBlock block(0, &join);
        block.start(0, {});
        std::vector<std::string> entries;
        do {
            giveAll(block, entries);
        } while (block.fill(*file) == EntryBlock::Fill::more);
        giveRest(block, entries);
        EXPECT_EQ(block.offset(), static_cast<std::int64_t>(content.size()));
        return entries;
    }

    std::vector<std::string> backwards(std::string_view content, const LineJoin& join) {
        const auto file = Generation::open(m_directory.write("log", content));
        BackwardBlock block(0, &join);
        block.start(static_cast<std::int64_t>(content.size()));
        std::vector<std::string> entries;
        while (block.fill(*file) == BackwardBlock::Fill::more) {
            while (const char* const entry = block.next()) {
                entries.push_back(shownLast(entry, block));
            }
        }
        std::reverse(entries.begin(), entries.end());
        return entries;
    }

    std::vector<std::string> both(std::string_view content, const LineJoin& join) {
        std::vector<std::string> entries = forwards(content, join);
        EXPECT_EQ(backwards(content, join), entries);
        return entries;
    }

    std::string randomLine() {
        const auto kind = m_random() % 1000;
        std::string line(kind < 3 ? m_random() % 200'000 : m_random() % 200,
                         static_cast<char>('a' + m_random() % 26));
        if (kind % 50 == 4) {
            line.insert(0, m_random() % 4, ' ');
        }
        if (kind % 50 == 5) {
            line.clear();
        }
        if (kind % 50 == 6) {
            line.insert(0, 1 + m_random() % 300, '\0');
        }
        if (kind % 50 == 7) {
            line += '\r';
        }
        return line;
    }

    std::string randomContent(std::size_t size) {
        std::string content;
        while (content.size() < size) {
            content += randomLine() + '\n';
        }
        content += m_random() % 2 == 0 ? randomLine() : "";
        return content;
    }

    /// Joins at random, but the same lines always in the same way.
    TestJoin randomJoin() {
        const std::size_t seed = m_random();
        const std::size_t percent = std::array{0, 20, 60, 95}[m_random() % 4];
        LineJoin::Limits limits;
        limits.lines = std::array{2, 3, 10, 1000}[m_random() % 4];
        limits.bytes = std::array{100, 1000, 64 * 1024}[m_random() % 3];
        const auto continues = [=](std::string_view before, std::string_view line) {
            const std::hash<std::string_view> hash;
            return (hash(before) + 31 * hash(line) + seed) % 100 < percent;
        };
        return TestJoin(continues, limits);
    }

    TemporaryDirectory m_directory;
    std::mt19937 m_random{20261122};
};

TEST_F(JoinedEntries, AnEntryIsALineAndThoseThatContinueIt) {
    const auto join = TestJoin::indented();
    EXPECT_THAT(both("one\n a\n b\ntwo\nthree\n c\n", *join),
                ElementsAre("one|one\n a\n b", "two|two", "three|three\n c"));
    EXPECT_THAT(both("", *join), IsEmpty());
    EXPECT_THAT(both("\n", *join), ElementsAre("|"));
}

TEST_F(JoinedEntries, AFileThatBeginsWithALineThatContinues) {
    EXPECT_THAT(both(" a\n b\none\n", *TestJoin::indented()), ElementsAre(" a| a\n b", "one|one"));
}

TEST_F(JoinedEntries, AnUnfinishedLineBelongsToTheEntryBeforeIt) {
    const auto join = TestJoin::indented();
    EXPECT_THAT(both("one\n a\n b", *join), ElementsAre("one|one\n a\n b"));
    EXPECT_THAT(both("one\n a\ntw", *join), ElementsAre("one|one\n a", "tw|tw"));
}

TEST_F(JoinedEntries, LineEndsInsideStayAndReturnsAreNoPartOfALine) {
    const TestJoin join([](std::string_view before, std::string_view line) {
        EXPECT_FALSE(before.ends_with('\r'));
        EXPECT_FALSE(line.ends_with('\r'));
        return line.empty() || line.starts_with(' ');
    });
    EXPECT_THAT(both("one\r\n a\r\n\r\n b\r\ntwo\r\n", join),
                ElementsAre("one\r|one\r\n a\r\n\r\n b", "two\r|two"));
}

TEST_F(JoinedEntries, NulBytesEndAnEntry) {
    const TestJoin join([](std::string_view, std::string_view) { return true; });
    EXPECT_THAT(both("one\n a\n\0\0two\n b\n"s, join), ElementsAre("one|one\n a", "two|two\n b"));
    EXPECT_THAT(both("one\n a\n\0\0"s, join), ElementsAre("one|one\n a"));
    EXPECT_THAT(both("one\n"s + std::string(700'000, '\0') + "two\n b\n", join),
                ElementsAre("one|one", "two|two\n b"));
}

TEST_F(JoinedEntries, TheLimitsEndAnEntry) {
    const auto lines = TestJoin::indented({.lines = 3});
    EXPECT_THAT(both("one\n a\n b\n c\n d\n e\n f\ntwo\n", *lines),
                ElementsAre("one|one\n a\n b", " c| c\n d\n e", " f| f", "two|two"));
    const auto bytes = TestJoin::indented({.bytes = 9});
    EXPECT_THAT(
        both("one\n a\n b\n and more than nine\n c\n", *bytes),
        ElementsAre("one|one\n a", " b| b", " and more than nine| and more than nine", " c| c"));
}

TEST_F(JoinedEntries, ALineThatIsTooLongIsAnEntryOfItsOwn) {
    const auto join = TestJoin::indented();
    for (const std::size_t length : {std::size_t{65'534}, longestText, std::size_t{3'000'000}}) {
        const std::string line = " " + std::string(length, 'x');
        const std::string content = "one\n a\n" + line + "\n b\n" + line + "\ntwo\n";
        EXPECT_TRUE(forwards(content, *join) == modelOf(content, *join)) << length;
        EXPECT_TRUE(backwards(content, *join) == modelOf(content, *join)) << length;
    }
}

TEST_F(JoinedEntries, OfALongFirstLineTheBeginningIsJudged) {
    const std::string line(5000, 'x');
    EXPECT_THAT(both(line + "\n a\n", *TestJoin::indented()),
                ElementsAre(line.substr(0, longestLine) + "|" + line + "\n a"));
}

TEST_F(JoinedEntries, AreThoseOfTheModelInBothDirections) {
    for (int round = 0; round < 120; ++round) {
        const std::string content = randomContent(m_random() % 900'000);
        const TestJoin join = randomJoin();
        const std::vector<std::string> expected = modelOf(content, join);
        ASSERT_TRUE(forwards(content, join) == expected) << "round " << round;
        ASSERT_TRUE(backwards(content, join) == expected) << "round " << round;
    }
}

TEST_F(JoinedEntries, AreTheSameHoweverTheFileGrows) {
    for (int round = 0; round < 60; ++round) {
        const std::string content = randomContent(m_random() % 20'000);
        const TestJoin join = randomJoin();
        const auto file = Generation::open(m_directory.write("log", ""));
        EntryBlock block(0, &join);
        block.start(0, {});
        std::vector<std::string> entries;
        for (std::size_t written = 0; written < content.size();) {
            const std::string_view more =
                std::string_view(content).substr(written, m_random() % 300);
            m_directory.append("log", more);
            written += more.size();
            while (block.fill(*file) == EntryBlock::Fill::more) {
                giveAll(block, entries);
            }
            if (written < content.size() && m_random() % 4 == 0) {
                block.release();
            }
        }
        giveRest(block, entries);
        ASSERT_TRUE(entries == modelOf(content, join)) << "round " << round;
    }
}

TEST_F(JoinedEntries, AnEntryThatIsTakenBackIsGivenAgain) {
    const auto join = TestJoin::indented();
    const auto file = Generation::open(m_directory.write("log", "one\n a\ntwo\n b\nthree\n"));
    EntryBlock block(0, join.get());
    block.start(0, {});
    ASSERT_EQ(block.fill(*file), EntryBlock::Fill::more);
    for (const char* const text : {"one\n a", "two\n b"}) {
        ASSERT_NE(block.next(), nullptr);
        EXPECT_EQ(block.text(), text);
        const std::int64_t behind = block.offset();
        ASSERT_TRUE(block.takeBack());
        EXPECT_LT(block.offset(), behind);
        ASSERT_NE(block.next(), nullptr);
        EXPECT_EQ(block.text(), text);
        EXPECT_EQ(block.offset(), behind);
    }
    EXPECT_EQ(block.next(), nullptr);
    EXPECT_TRUE(block.isWaiting());
    EXPECT_EQ(block.waitingTo(), 20);
    ASSERT_NE(block.endWaiting(), nullptr);
    EXPECT_EQ(block.text(), "three");
    EXPECT_FALSE(block.isWaiting());
}

TEST_F(JoinedEntries, ARunOfAnyLengthTakesBoundedMemoryBackwards) {
    std::string content = "first\n";
    for (int line = 0; line < 200'000; ++line) {
        content += " line " + std::to_string(line) + "\n";
    }
    const std::vector<std::string> entries = backwards(content, *TestJoin::indented());
    std::string joined;
    for (const std::string& entry : entries) {
        joined += entry.substr(entry.find('|') + 1) + '\n';
        EXPECT_LE(entry.size(), LineJoin::mostBytes + 100);
    }
    EXPECT_TRUE(joined == content) << "no line is missing or there twice";
}

} // namespace
