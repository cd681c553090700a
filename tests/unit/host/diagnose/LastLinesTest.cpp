#include "host/diagnose/LastLines.h"

#include "host/diagnose/MonitoredLogFile.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <optional>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::Optional;

class LastLinesTest : public testing::Test {
protected:
    auto read(const std::string& text, std::size_t count) {
        const auto file = MonitoredLogFile::open(m_directory.write("log", text), std::nullopt);
        return LastLines::read(file.value().descriptor(), count);
    }
    TemporaryDirectory m_directory;
};

TEST_F(LastLinesTest, ReturnsTheLastLinesInOrder) {
    EXPECT_THAT(read("one\ntwo\nthree\n", 2), Optional(ElementsAre("two", "three")));
    EXPECT_THAT(read("one\ntwo\nthree\n", 3), Optional(ElementsAre("one", "two", "three")));
    EXPECT_THAT(read("one\ntwo\nthree\n", 9), Optional(ElementsAre("one", "two", "three")));
}

TEST_F(LastLinesTest, ReturnsEmptyLinesAndALastLineWithoutNewline) {
    EXPECT_THAT(read("one\ntwo", 2), Optional(ElementsAre("one", "two")));
    EXPECT_THAT(read("one\n\n", 2), Optional(ElementsAre("one", "")));
    EXPECT_THAT(read("\n", 2), Optional(ElementsAre("")));
    EXPECT_THAT(read("", 2), Optional(IsEmpty()));
}

TEST_F(LastLinesTest, ReadsNoMoreThanItsLimitAndOnlyWholeLines) {
    const std::string line(1023, 'x');
    std::string text;
    for (int i = 0; i < 5000; ++i) {
        text += line + "\n";
    }
    const auto lines = read("y" + text, 5000);
    ASSERT_TRUE(lines);
    EXPECT_EQ(lines->size(), LastLines::defaultByteLimit / 1024 - 1);
    for (const std::string& one : *lines) {
        ASSERT_EQ(one, line);
    }
}

TEST_F(LastLinesTest, ReportsWhyAFileCannotBeRead) {
    EXPECT_EQ(LastLines::read(-1, 1), std::nullopt);
    EXPECT_EQ(errno, EBADF);
}

} // namespace
