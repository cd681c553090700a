#include "SyslogReportTest.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <cstring>
#include <random>
#include <string>
#include <vector>

using namespace zrm;

namespace {

/// Reports over files of many sizes in blocks of many sizes.
class SyslogReportSizes : public SyslogReport {
protected:
    /// A line of this many bytes including its newline. Sets `expected` to its row's description.
    std::string line(std::size_t length) {
        std::string text = "Oct  5 07:00:00 h s: " + std::to_string(m_number++) + ".";
        if (text.size() + 1 < length) {
            text.append(length - text.size() - 1, 'x');
        }
        return text + "\n";
    }
    static std::string descriptionOf(const std::string& line) {
        const std::size_t before = std::strlen("Oct  5 07:00:00 h s: ");
        return line.substr(before, std::min<std::size_t>(line.size() - before - 1, 256));
    }
    /// The descriptions of the content's lines, read forwards and then reversed.
    static std::vector<std::string> forwards(const std::string& content) {
        std::vector<std::string> descriptions;
        for (std::size_t begin = 0; begin < content.size();) {
            const std::size_t newline = content.find('\n', begin);
            const std::size_t end = newline == std::string::npos ? content.size() : newline + 1;
            descriptions.insert(descriptions.begin(),
                                descriptionOf(content.substr(begin, end - begin)));
            begin = end;
        }
        return descriptions;
    }
    /// The same by the rule for reading backwards, taken literally: byte by byte, block by block.
    static std::vector<std::string> backwards(const std::string& content, std::size_t blockSize) {
        std::vector<std::string> descriptions;
        std::size_t start = content.size(); // of the block
        std::size_t end = content.size();   // of what was not consumed
        const auto fill = [&] {
            if (start == 0) {
                return false;
            }
            start = end > blockSize ? end - blockSize : 0;
            return true;
        };
        for (;;) {
            if (start == end && !fill()) {
                return descriptions;
            }
            bool isFound = false;
            bool isGivenUp = false;
            std::size_t begin = start;
            for (std::size_t at = end - 1; at > start && !isFound && !isGivenUp; --at) {
                isFound = content[at - 1] == '\n';
                isGivenUp = !isFound && end - (at - 1) > 999;
                begin = at;
            }
            if (isFound || (!isGivenUp && start == 0)) {
                begin = isFound ? begin : 0;
                const std::string text = content.substr(begin, end - begin);
                if (text.size() < 15) {
                    return descriptions; // no time: older than any window
                }
                descriptions.push_back(text.size() < 22 ? "" : descriptionOf(text));
                end = begin;
                continue;
            }
            if (isGivenUp || end - start >= blockSize) {
                --end;
            }
            if (!fill()) {
                return descriptions;
            }
        }
    }

    int m_number = 0;
};

TEST_F(SyslogReportSizes, FilesNearBlockBoundariesReadTheSameAsForwards) {
    constexpr std::size_t block = 1024;
    const FakeBlockSize blocks(block);
    for (const std::size_t size : {block - 1, block, block + 1, 2 * block - 1, 2 * block,
                                   2 * block + 1, 3 * block - 1, 3 * block, 3 * block + 1}) {
        for (const std::size_t lineLength : {64UL, 100UL, 128UL, 500UL, 999UL}) {
            for (const bool hasFinalNewline : {true, false}) {
                std::string content;
                while (content.size() + 2 * lineLength <= size) {
                    content += line(lineLength);
                }
                if (content.size() + 30 < size && size - content.size() <= 999) {
                    content += line(size - content.size());
                    ASSERT_EQ(content.size(), size);
                }
                if (!hasFinalNewline && !content.empty()) {
                    content.pop_back();
                }
                m_directory.write("messages", content);
                ASSERT_EQ(report(), forwards(content))
                    << size << " bytes in lines of " << lineLength;
            }
        }
    }
}

TEST_F(SyslogReportSizes, EverySplitOfALineByABlockIsRead) {
    constexpr std::size_t block = 1024;
    const FakeBlockSize blocks(block);
    for (std::size_t last = 30; last < 200; ++last) {
        const std::string content = line(300) + line(900) + line(500) + line(last);
        m_directory.write("messages", content);
        ASSERT_EQ(report(), forwards(content)) << last;
    }
}

TEST_F(SyslogReportSizes, ALineOf999BytesIsWholeAndALongerOneInTheFirstBlockEndsTheReport) {
    const FakeBlockSize blocks(4096);
    std::string content = line(50) + line(999) + line(50);
    m_directory.write("messages", content);
    EXPECT_EQ(report(), forwards(content));
    content = line(50) + line(1000) + line(50);
    m_directory.write("messages", content);
    EXPECT_EQ(report().size(), 1U);
    content = line(1000);
    m_directory.write("messages", content);
    EXPECT_EQ(report().size(), 0U);
}

TEST_F(SyslogReportSizes, OnlyTheBeginningOfALongLineAfterEarlierBlocksIsReturned) {
    const FakeBlockSize blocks(4096);
    std::string content;
    while (content.size() < 20000) {
        content += line(100);
    }
    content += line(1000) + line(60) + line(9000) + line(70) + line(1500000) + line(80);
    m_directory.write("messages", content);
    EXPECT_EQ(report(), forwards(content));
}

TEST_F(SyslogReportSizes, CuttingALongLineEndsTheReportOnlyWhereABlockReachesTheFilesStart) {
    constexpr std::size_t block = 4096;
    const FakeBlockSize blocks(block);
    for (std::size_t before = block - 1004; before < block - 996; ++before) {
        std::string content;
        while (content.size() + 600 < before) {
            content += line(500);
        }
        content += line(before - content.size());
        ASSERT_EQ(content.size(), before);
        content += line(2000) + line(50);
        m_directory.write("messages", content);
        // The last overlong rest of the line ends 1001 bytes after the newline before it.
        const bool isGiven = before + 1000 > block;
        EXPECT_EQ(report().size(), isGiven ? forwards(content).size() : 1U) << before;
        EXPECT_EQ(report(), backwards(content, block)) << before;
    }
}

TEST_F(SyslogReportSizes, ALineOf1000BytesAfterOtherBytesIsReturnedWithoutItsLastByte) {
    constexpr std::size_t block = 4096;
    const FakeBlockSize blocks(block);
    std::string content;
    for (const std::size_t length : {500UL, 500UL, 500UL, 500UL, 1000UL, 500UL, 500UL, 500UL}) {
        content += line(length);
    }
    ASSERT_GT(content.size(), block); // the line is in the first block that is read
    m_directory.write("messages", content);
    EXPECT_EQ(report(), forwards(content));
    EXPECT_EQ(report(), backwards(content, block));
}

TEST_F(SyslogReportSizes, RandomFilesAreReadByTheRuleInEveryBlockSize) {
    const unsigned seed = std::random_device{}();
    SCOPED_TRACE("seed " + std::to_string(seed));
    std::mt19937 random(seed);
    for (int round = 0; round < 150; ++round) {
        std::string content;
        for (unsigned lines = static_cast<unsigned>(random() % 25); lines > 0; --lines) {
            switch (random() % 8) {
            case 0:
                content += line(990 + random() % 20);
                break;
            case 1:
                content += line(1000 + random() % 1500);
                break;
            case 2:
                content += line(0);
                break;
            default:
                content += line(30 + random() % 200);
                break;
            }
        }
        if (!content.empty() && random() % 3 == 0) {
            content.pop_back();
        }
        constexpr long sizes[] = {1, 2, 64, 500, 998, 999, 1000, 1001, 1024, 4096, 65536};
        const long blockSize = sizes[random() % std::size(sizes)];
        const FakeBlockSize blocks(blockSize);
        m_directory.write("messages", content);
        ASSERT_EQ(report("0000000000000001"),
                  backwards(content, static_cast<std::size_t>(blockSize)))
            << "round " << round << ", blocks of " << blockSize;
    }
}

} // namespace
