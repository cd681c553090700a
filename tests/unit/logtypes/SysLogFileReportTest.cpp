#include "SyslogTest.h"

#include "logtypes/SyslogBufferInfo.h"
#include "tables/RequestThresholds.h"

#include <gmock/gmock.h>

#include <cstring>
#include <filesystem>
#include <random>
#include <vector>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr const char* farPast = "0000000000000000";
constexpr const char* farFuture = "9999999999999999";

_RequestThresholds window(const char* start, const char* end) {
    _RequestThresholds thresholds{};
    std::memcpy(thresholds.startTime, start, 16);
    std::memcpy(thresholds.endTime, end, 16);
    return thresholds;
}

class SyslogReport : public SyslogTest {
protected:
    ~SyslogReport() override { m_log->endReportRequest(&m_state); }

    void start() {
        m_state = m_log->startReportRequest(nullptr);
        ASSERT_NE(m_state, nullptr);
    }
    bool next() {
        std::memset(&m_row, '#', sizeof m_row);
        void* const given = m_log->getNextLogEntry(&m_row, m_state, &m_window);
        EXPECT_TRUE(given == nullptr || given == &m_row);
        return given != nullptr;
    }
    /// The descriptions of a whole report over the present content of the log.
    std::vector<std::string> report(const char* from = farPast, const char* to = farFuture) {
        m_window = window(from, to);
        std::vector<std::string> descriptions;
        m_state = m_log->startReportRequest(nullptr);
        if (m_state == nullptr) {
            return descriptions;
        }
        while (next()) {
            descriptions.push_back(columnText(m_row.entrydesc));
        }
        m_log->endReportRequest(&m_state);
        EXPECT_EQ(m_state, nullptr);
        return descriptions;
    }
    /// The times of a whole report.
    std::vector<std::string> times(const std::string& content) {
        m_directory.write("messages", content);
        m_window = window(farPast, farFuture);
        std::vector<std::string> stamps;
        start();
        while (next()) {
            stamps.push_back(columnText(m_row.entrytime));
        }
        return stamps;
    }

    void* m_state = nullptr;
    _RequestThresholds m_window = window(farPast, farFuture);
    zrm_rmlogent_data_t m_row;
};

TEST_F(SyslogReport, GivesTheNewestEntryFirst) {
    m_directory.write("messages", "Oct  5 07:00:00 h s: one\n"
                                  "Oct  5 08:00:00 h s: two\n"
                                  "Oct  5 09:00:00 h s: three\n");
    EXPECT_THAT(report(), ElementsAre("three", "two", "one"));
}

TEST_F(SyslogReport, FillsWholeRows) {
    m_directory.write("messages", "Oct  5 07:03:09 web1 sshd[412]: Failed\n");
    start();
    ASSERT_TRUE(next());
    EXPECT_EQ(columnText(m_row.entrytime), "1061005070309000");
    EXPECT_EQ(columnText(m_row.entrysys), "web1");
    EXPECT_EQ(columnText(m_row.entrysrc), "sshd[412]");
    EXPECT_EQ(columnText(m_row.entrydesc), "Failed");
    EXPECT_EQ(columnText(m_row.logname), "messages");
    EXPECT_EQ(columnText(m_row.timestamp), "1061005120000000");
}

TEST_F(SyslogReport, HasTheWindowsBordersInIt) {
    m_directory.write("messages", "Oct  5 07:00:00 h s: older\n"
                                  "Oct  5 08:00:00 h s: first\n"
                                  "Oct  5 09:00:00 h s: last\n"
                                  "Oct  5 10:00:00 h s: newer\n");
    EXPECT_THAT(report("1061005080000000", "1061005090000000"), ElementsAre("last", "first"));
    EXPECT_THAT(report("1061005080001000", "1061005085959000"), IsEmpty());
    EXPECT_THAT(report("1061005100000000", farFuture), ElementsAre("newer"));
    EXPECT_THAT(report(farPast, "1061005070000000"), ElementsAre("older"));
    EXPECT_THAT(report(farPast, "1061005065959000"), IsEmpty());
}

TEST_F(SyslogReport, EndsAtTheFirstEntryThatIsOlder) {
    m_directory.write("messages", "Oct  5 09:00:00 h s: late entry of an early time's log\n"
                                  "Oct  5 07:00:00 h s: older\n"
                                  "Oct  5 09:30:00 h s: in time\n");
    EXPECT_THAT(report("1061005080000000", farFuture), ElementsAre("in time"));
}

TEST_F(SyslogReport, EndsAtALineWithoutAMonth) {
    m_directory.write("messages", "Oct  5 07:00:00 h s: one\n"
                                  "no time at all\n"
                                  "Oct  5 08:00:00 h s: two\n");
    EXPECT_THAT(report("1061005000000000", farFuture), ElementsAre("two"));
    m_directory.append("messages", "\n"); // an empty line
    EXPECT_THAT(report("1061005000000000", farFuture), IsEmpty());
}

TEST_F(SyslogReport, AWindowOpenToThePastHasTheLinesWithoutAMonth) {
    m_directory.write("messages", "Oct  5 07:00:00 h s: one\n"
                                  "no time at all\n"
                                  "Oct  5 08:00:00 h s: two\n");
    EXPECT_THAT(report("                ", farFuture), ElementsAre("two", "", "one"));
}

TEST_F(SyslogReport, TakesALastLineWithoutANewline) {
    m_directory.write("messages", "Oct  5 07:00:00 h s: one\nOct  5 08:00:00 h s: two");
    EXPECT_THAT(report(), ElementsAre("tw", "one"));
    m_directory.write("messages", "Oct  5 07:00:00 h s: only");
    EXPECT_THAT(report(), ElementsAre("onl"));
}

TEST_F(SyslogReport, OverAnEmptyLogCannotStart) {
    RecordingTrace trace(TRC1_DETAIL);
    EXPECT_EQ(m_log->startReportRequest(nullptr), nullptr);
    EXPECT_TRUE(trace.contains("Log " + m_path + " is empty; report request terminating."));
}

TEST_F(SyslogReport, LeavesOutWhatIsAppendedMeanwhile) {
    m_directory.write("messages", "Oct  5 07:00:00 h s: one\n");
    start();
    m_directory.append("messages", "Oct  5 08:00:00 h s: two\n");
    ASSERT_TRUE(next());
    EXPECT_EQ(columnText(m_row.entrydesc), "one");
    EXPECT_FALSE(next());
}

TEST_F(SyslogReport, DatesEntriesAcrossTheNewYear) {
    m_clock.set(1167825600); // 3 January 2007, 12:00:00 UTC
    EXPECT_THAT(times("Dec 30 10:00:00 h s: a\n"
                      "Dec 31 10:00:00 h s: b\n"
                      "Jan  1 10:00:00 h s: c\n"
                      "Jan  2 10:00:00 h s: d\n"
                      "Jan  3 10:00:00 h s: e\n"),
                ElementsAre("1070103100000000", "1070102100000000", "1070101100000000",
                            "1061231100000000", "1061230100000000"));
}

TEST_F(SyslogReport, GoesBackOneYearAtEachCrossing) {
    m_clock.set(946857600); // 3 January 2000
    EXPECT_THAT(times("Mar  1 10:00:00 h s: a\n"
                      "Dec 31 10:00:00 h s: b\n"
                      "Feb  1 10:00:00 h s: c\n"
                      "Dec 31 10:00:00 h s: d\n"
                      "Jan  2 10:00:00 h s: e\n"),
                ElementsAre("1000102100000000", "0991231100000000", "0990201100000000",
                            "0981231100000000", "0980301100000000"));
}

TEST_F(SyslogReport, AnEntryOfALaterDayThanTodayIsOfLastYear) {
    EXPECT_THAT(times("Oct  6 00:00:00 h s: a\n"
                      "Oct  5 23:00:00 h s: later today\n"),
                ElementsAre("1061005230000000", "1051006000000000"));
}

TEST_F(SyslogReport, DatesSkippedEntriesToo) {
    m_clock.set(1167825600); // 3 January 2007
    m_directory.write("messages", "Dec 31 10:00:00 h s: a\n"
                                  "Jan  1 10:00:00 h s: b\n");
    EXPECT_THAT(report(farPast, "1061231235959000"), ElementsAre("a"));
}

TEST_F(SyslogReport, TracesTheBufferInDetail) {
    m_directory.write("messages", "Oct  5 07:00:00 h s: one\n");
    const FakeBlockSize blocks(4096);
    RecordingTrace trace(TRC1_DETAIL);
    start();
    EXPECT_EQ(trace.messages()[0], "Read buffer of size 4097 allocated for file " + m_path + ".");
}

TEST_F(SyslogReport, CannotStartWhenTheFileIsGone) {
    std::filesystem::remove(m_path);
    RecordingTrace trace(TRC1_ERROR);
    EXPECT_EQ(m_log->startReportRequest(nullptr), nullptr);
    EXPECT_THAT(trace.messages(), ElementsAre("stat() command failed for " + m_path +
                                              ";  errno = 2; No such file or directory."));
}

TEST_F(SyslogReport, CannotStartWithoutMemory) {
    m_directory.write("messages", "Oct  5 07:00:00 h s: one\n");
    const FakeBlockSize blocks(4096);
    RecordingTrace trace(TRC1_ERROR);
    {
        const Fault fault("new", ENOMEM);
        EXPECT_EQ(m_log->startReportRequest(nullptr), nullptr);
    }
    EXPECT_THAT(trace.messages(),
                ElementsAre("Memory allocation of " + std::to_string(sizeof(SyslogBufferInfo)) +
                            " bytes failed."));
    trace.clear();
    {
        const Fault fault("new", ENOMEM, {.skip = 1});
        EXPECT_EQ(m_log->startReportRequest(nullptr), nullptr);
    }
    EXPECT_THAT(trace.messages(), ElementsAre("Memory allocation of 4097 bytes failed."));
}

TEST_F(SyslogReport, CannotStartWhenTheFileCannotBeOpened) {
    const Fault fault("open", EACCES);
    RecordingTrace trace(TRC1_ERROR);
    EXPECT_EQ(m_log->startReportRequest(nullptr), nullptr);
    EXPECT_THAT(trace.messages(), ElementsAre("Error opening file " + m_path +
                                              " for report.  errno = 13; Permission denied"));
}

TEST_F(SyslogReport, ClosesItsDescriptorAtItsEnd) {
    m_directory.write("messages", "Oct  5 07:00:00 h s: one\n");
    start();
    const int fd = static_cast<SyslogBufferInfo*>(m_state)->fd;
    RecordingTrace trace(TRC1_DETAIL);
    m_log->endReportRequest(&m_state);
    EXPECT_EQ(m_state, nullptr);
    EXPECT_THAT(trace.messages(),
                ElementsAre("fd " + std::to_string(fd) + " closed for report on " + m_path + "."));
    m_log->endReportRequest(&m_state); // a report that never started
}

TEST_F(SyslogReport, AReadThatFailsEndsTheReportWithWhatItHas) {
    const FakeBlockSize blocks(1024);
    std::string content;
    for (int i = 0; i < 100; ++i) {
        content += "Oct  5 07:00:00 h s: line " + std::to_string(i) + "\n";
    }
    m_directory.write("messages", content);
    RecordingTrace trace(TRC1_ERROR);
    const Fault fault("read", EIO, {.skip = 1});
    const auto lines = report();
    EXPECT_GT(lines.size(), 20U);
    EXPECT_LT(lines.size(), 100U);
    EXPECT_THAT(trace.messages(), ElementsAre("Error while reading file " + m_path +
                                              ". Bytes requested = 1024. Bytes received = -1."));
}

TEST_F(SyslogReport, ALogThatShrinksEndsTheReportWithWhatItHas) {
    const FakeBlockSize blocks(1024);
    std::string content;
    for (int i = 0; i < 100; ++i) {
        content += "Oct  5 07:00:00 h s: line\n";
    }
    m_directory.write("messages", content);
    start();
    ASSERT_TRUE(next());
    m_directory.write("messages", "");
    int given = 1;
    while (next()) {
        ++given;
    }
    EXPECT_GT(given, 20);
    EXPECT_LT(given, 100);
    EXPECT_FALSE(next());
}

TEST_F(SyslogReport, TwoReportsAtOnceDoNotDisturbEachOther) {
    const FakeBlockSize blocks(1024);
    std::string content;
    for (int i = 0; i < 200; ++i) {
        content += "Oct  5 07:00:00 h s: line " + std::to_string(i) + ".\n";
    }
    m_directory.write("messages", content);
    const auto read = [&] {
        _RequestThresholds thresholds = window(farPast, farFuture);
        for (int round = 0; round < 20; ++round) {
            void* state = m_log->startReportRequest(nullptr);
            zrm_rmlogent_data_t row;
            for (int i = 199; i >= 0; --i) {
                ASSERT_NE(m_log->getNextLogEntry(&row, state, &thresholds), nullptr);
                ASSERT_EQ(columnText(row.entrydesc), "line " + std::to_string(i) + ".");
            }
            ASSERT_EQ(m_log->getNextLogEntry(&row, state, &thresholds), nullptr);
            m_log->endReportRequest(&state);
        }
    };
    std::thread other(read);
    read();
    other.join();
}

/// Reports over files of many sizes in blocks of many sizes.
class SyslogReportSizes : public SyslogReport {
protected:
    /// A line of so many bytes with its newline; what its row's description is goes to `expected`.
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
    /// The descriptions of the content's lines, read forwards and turned around.
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
    /// The same by the rule for reading backwards, said literally: byte by byte, block by block.
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
                    return descriptions; // has no time: older than any window
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

TEST_F(SyslogReportSizes, FilesAroundBlockBordersAreReadAsForwards) {
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

TEST_F(SyslogReportSizes, ALongLineWithEarlierBlocksBeforeItIsGivenByItsBeginning) {
    const FakeBlockSize blocks(4096);
    std::string content;
    while (content.size() < 20000) {
        content += line(100);
    }
    content += line(1000) + line(60) + line(9000) + line(70) + line(1500000) + line(80);
    m_directory.write("messages", content);
    EXPECT_EQ(report(), forwards(content));
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
