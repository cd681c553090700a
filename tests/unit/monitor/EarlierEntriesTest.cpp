#include "monitor/EarlierEntries.h"

#include "FakeCompression.h"
#include "TestJoin.h"
#include "monitor/Interruption.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdlib>
#include <cstring>
#include <random>
#include <string>
#include <vector>

#include <fcntl.h>
#include <sys/stat.h>

using namespace zrm;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

/// Entries are lines "SECONDS text"; others have no time.
std::optional<EntryClock::Range> timeOf(const char* entry, std::string_view /*text*/) {
    char* end = nullptr;
    const std::int64_t time = std::strtoll(entry, &end, 10);
    if (end == entry) {
        return std::nullopt;
    }
    return EntryClock::Range{time, time};
}

class EarlierEntriesTest : public testing::Test {
protected:
    std::vector<std::string> read(const std::string& name, std::int64_t offset,
                                  std::int64_t period) {
        const auto file = Generation::open(m_directory.file(name));
        EarlierEntries earlier(m_directory.file("log"), "", 0);
        earlier.leaveOutLate(m_late);
        std::vector<std::string> entries;
        earlier.read(*file, offset, period, timeOf, [&](char* entry, std::string_view text) {
            EXPECT_EQ(text, std::string_view(entry, std::strcspn(entry, "\n")));
            entries.emplace_back(text);
            return entries.size() != m_most;
        });
        m_unread = earlier.unread();
        return entries;
    }
    /// Writes a file and makes it older than those written before.
    void write(const std::string& name, const std::string& content) {
        const std::string path = m_directory.write(name, content);
        m_age += 100;
        const timespec times[2] = {{1'000'000 - m_age, 0}, {1'000'000 - m_age, 0}};
        ASSERT_EQ(utimensat(AT_FDCWD, path.c_str(), times, 0), 0);
    }
    static std::string lines(int from, int to) {
        std::string text;
        for (int second = from; second < to; ++second) {
            text += std::to_string(second) + " entry\n";
        }
        return text;
    }

    const FakeCompression m_compression;
    std::vector<std::string> m_unread;
    TemporaryDirectory m_directory;
    LatePositions m_late;
    std::size_t m_most = 0;
    std::time_t m_age = 0;
};

TEST_F(EarlierEntriesTest, EndsAtThePlace) {
    write("log", "1 a\n2 b\n3 c\n");
    EXPECT_THAT(read("log", 8, 60), ElementsAre("1 a", "2 b"));
    EXPECT_THAT(read("log", 12, 60), ElementsAre("1 a", "2 b", "3 c"));
    EXPECT_THAT(read("log", 0, 60), IsEmpty());
}

TEST_F(EarlierEntriesTest, LeavesOutLateLinesThatWereNotJudged) {
    write("log", "4 d\n");
    write("log.1", "1 a\n2 b\n3 late\n");
    EXPECT_THAT(read("log", 4, 60), ElementsAre("1 a", "2 b", "3 late", "4 d"));
    const auto older = Generation::open(m_directory.file("log.1"));
    m_late = LatePositions({positionOf(older->identity(), 8, {})});
    EXPECT_THAT(read("log", 4, 60), ElementsAre("1 a", "2 b", "4 d"));
}

TEST_F(EarlierEntriesTest, ReadsALargeFileOnlyAsFarBackAsThePeriodGoes) {
    const std::string content = lines(100'000, 900'000);
    write("log", content);
    const auto entries = read("log", static_cast<std::int64_t>(content.size()), 60);
    EXPECT_EQ(entries.back(), "899999 entry");
    EXPECT_THAT(entries, SizeIs(testing::AllOf(testing::Ge(60U), testing::Le(10'000U))));
    EXPECT_THAT(read("log", static_cast<std::int64_t>(content.size()), 500'000),
                SizeIs(testing::Ge(500'000U)));
}

TEST_F(EarlierEntriesTest, AnOldEntryDoesNotEndTheSearch) {
    std::string content = lines(100'000, 120'000);
    // At every place at which the search may look.
    for (std::size_t at = content.find('\n', content.size() - 140'000); at < content.size() - 2000;
         at = content.find('\n', at + 1000)) {
        content.insert(at + 1, "5 old\n");
    }
    write("log", content);
    const auto entries = read("log", static_cast<std::int64_t>(content.size()), 15'000);
    EXPECT_THAT(entries, testing::Contains("105000 entry"));
}

TEST_F(EarlierEntriesTest, GoesBackIntoOlderGenerations) {
    write("log", "103 c\n");
    write("log.1", "101 a\n102 b\nno time");
    write("log.2", "9 older\n10 older\n");
    write("log.3", "8 not read\n");
    EXPECT_THAT(read("log", 6, 60),
                ElementsAre("9 older", "10 older", "101 a", "102 b", "no time", "103 c"));
    EXPECT_THAT(read("log", 0, 60),
                ElementsAre("9 older", "10 older", "101 a", "102 b", "no time"));
    EXPECT_THAT(read("log.1", 6, 60), ElementsAre("9 older", "10 older", "101 a"));
}

TEST_F(EarlierEntriesTest, ReadsCompressedGenerationsAndNoFileTwice) {
    write("log", "103 c\n");
    write("log.1", "103 c\n");
    write("log.2", "101 a\n102 b\n");
    write("log.2.gz", "GZ101 a\n102 b\n");
    write("log.3.gz", "GZ99 x\n100 y\n");
    write("log.4.gz", "GZ7 older\n");
    write("log.5.gz", "GZ8 not read\n");
    EXPECT_THAT(read("log", 6, 60),
                ElementsAre("7 older", "99 x", "100 y", "101 a", "102 b", "103 c"));
}

TEST_F(EarlierEntriesTest, LeavesOutCompressedGenerationsThatAreDamaged) {
    write("log", "103 c\n");
    write("log.1.gz", "GZ101 a\n102 wrong\n\x01");
    write("log.2.gz", "GZ99 x\n100 y\n");
    EXPECT_THAT(read("log", 6, 60), ElementsAre("99 x", "100 y", "103 c"));
    EXPECT_THAT(m_unread, ElementsAre(m_directory.file("log.1.gz")));
}

TEST_F(EarlierEntriesTest, LeavesOutCompressedGenerationsThatCannotBeCheckedBeforeAStop) {
    write("log", "103 c\n");
    write("log.1.gz", "GZ" + lines(1, 200'000));
    const Interruption stop([] { return true; });
    EXPECT_THAT(read("log", 6, 60), ElementsAre("103 c"));
    EXPECT_THAT(m_unread, ElementsAre(m_directory.file("log.1.gz")));
}

TEST_F(EarlierEntriesTest, EndsWhenToldTo) {
    write("log", "1 a\n2 b\n3 c\n");
    m_most = 2;
    EXPECT_THAT(read("log", 12, 60), ElementsAre("1 a", "2 b"));
}

TEST_F(EarlierEntriesTest, WithoutTimesTheFilesTimeOfChangeDecides) {
    write("log", "a\nb\n");
    write("log.1", "1 c\n");
    EXPECT_THAT(read("log", 4, 60), ElementsAre("1 c", "a", "b"));
}

TEST_F(EarlierEntriesTest, EntriesOfSeveralLinesEndAtThePlace) {
    // The last line came so late that the lines before it were judged without it.
    write("log", "1 a\n more\n2 b\n more\n late\n");
    const auto file = Generation::open(m_directory.file("log"));
    const auto join = TestJoin::indented();
    EarlierEntries earlier(m_directory.file("log"), "", 0, join.get());
    std::vector<std::string> texts;
    earlier.read(*file, 20, 60, timeOf, [&](char* /*entry*/, std::string_view text) {
        texts.emplace_back(text);
        return true;
    });
    EXPECT_THAT(texts, ElementsAre("1 a\n more", "2 b\n more"));
}

TEST_F(EarlierEntriesTest, ReadsRecords) {
    write("log", "1aa2bb3cc");
    const auto file = Generation::open(m_directory.file("log"));
    EarlierEntries earlier(m_directory.file("log"), "", 3);
    std::string read;
    earlier.read(*file, 6, 60, timeOf, [&](char* record, std::string_view) {
        read.append(record, 3);
        return true;
    });
    EXPECT_EQ(read, "1aa2bb");
}

} // namespace
