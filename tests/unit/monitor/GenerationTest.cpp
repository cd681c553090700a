#include "monitor/Generation.h"

#include "FakeCompression.h"
#include "support/Faults.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

using namespace zrm;

namespace {

class GenerationCopy : public testing::Test {
protected:
    bool isCopy(std::string_view name, std::string_view content, std::string_view otherName,
                std::string_view otherContent) {
        const auto one = Generation::open(m_directory.write(name, content));
        const auto other = Generation::open(m_directory.write(otherName, otherContent));
        return one->isCopyOf(*other);
    }

    const FakeCompression m_compression;
    TemporaryDirectory m_directory;
};

TEST_F(GenerationCopy, IsAnEqualFileOrTheBeginningOfAnother) {
    EXPECT_TRUE(isCopy("a", "1\n2\n", "b", "1\n2\n"));
    EXPECT_TRUE(isCopy("a", "1\n", "b", "1\n2\n"));
    EXPECT_FALSE(isCopy("a", "1\n2\n3\n", "b", "1\n2\n"));
    EXPECT_FALSE(isCopy("a", "1\n3\n", "b", "1\n2\n"));
    EXPECT_FALSE(isCopy("a", "", "b", "1\n2\n"));
}

TEST_F(GenerationCopy, IsNotAFileThatOnlyBeginsAndEndsAlike) {
    const std::string same(5000, 's');
    EXPECT_FALSE(isCopy("a", same + "1\n", "b", same + "2\n" + same));
    EXPECT_TRUE(isCopy("a", same + "1\n", "b", same + "1\n" + same));
}

TEST_F(GenerationCopy, IsNotACompressedFileWithMoreInIt) {
    EXPECT_TRUE(isCopy("a.gz", "GZ1\n2\n", "b", "1\n2\n"));
    EXPECT_FALSE(isCopy("a.gz", "GZ1\n2\n3\n", "b", "1\n2\n"));
    EXPECT_FALSE(isCopy("a.gz", "GZ3\n", "b", "1\n2\n"));
}

TEST_F(GenerationCopy, IsNotACompressedFileThatOnlyBeginsAlike) {
    const std::string banner(5000, 's');
    EXPECT_FALSE(isCopy("a.gz", "GZ" + banner + "2\n", "b", banner + "3\n4\n"));
    EXPECT_FALSE(isCopy("a", banner + "2\n", "b.gz", "GZ" + banner + "3\n4\n"));
    EXPECT_TRUE(isCopy("a.gz", "GZ" + banner + "2\n", "b", banner + "2\n3\n"));
    EXPECT_TRUE(isCopy("a.gz", "GZ" + banner + "2\n\x01", "b", banner + "2\n3\n")); // unfinished
}

TEST(GenerationTest, PassesOverCompressedContentsInLargeSteps) {
    const FakeCompression compression;
    const TemporaryDirectory directory;
    const auto file =
        Generation::open(directory.write("a.gz", "GZ" + std::string(100'000, 'x') + "y"));
    const Fault reads("read", 0, {.skip = 0, .times = 0});
    char byte = '\0';
    EXPECT_EQ(file->readAt(&byte, 1, 100'000), 1);
    EXPECT_EQ(byte, 'y');
    EXPECT_GT(reads.calls(), 0);
    EXPECT_LT(reads.calls(), 100);
}

} // namespace
