#include "monitor/LogLedger.h"

#include "TestLog.h"

#include <gmock/gmock.h>

#include <array>
#include <ctime>
#include <filesystem>
#include <memory>
#include <thread>

using namespace zrm;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

std::vector<std::string> rejectedBy(const LogLedger& ledger) {
    const auto lines = std::make_unique<std::array<LogLedger::RejectedLine, LogLedger::mostKept>>();
    const std::size_t count = ledger.copyRejected(lines->data());
    std::vector<std::string> texts;
    for (std::size_t i = 0; i < count; ++i) {
        texts.emplace_back((*lines)[i].text, (*lines)[i].length);
    }
    return texts;
}

std::vector<LogLedger::SkippedRange> skippedBy(const LogLedger& ledger) {
    std::vector<LogLedger::SkippedRange> ranges(LogLedger::mostKept);
    ranges.resize(ledger.copySkipped(ranges.data()));
    return ranges;
}

/// The time by the ledger's own clock; that of time() may lag behind it.
timespec now() {
    timespec time{};
    clock_gettime(CLOCK_REALTIME, &time);
    return time;
}

TEST(LogLedger, BeginsEmpty) {
    const LogLedger ledger;
    EXPECT_EQ(ledger.bytesRead(), 0);
    EXPECT_EQ(ledger.truncations(), 0);
    EXPECT_EQ(ledger.skippedBytes(), 0);
    EXPECT_EQ(ledger.restarts(), 0);
    EXPECT_EQ(ledger.lastEntry(), 0);
    EXPECT_THAT(rejectedBy(ledger), IsEmpty());
    EXPECT_THAT(skippedBy(ledger), IsEmpty());
}

TEST(LogLedger, CountsRowsWithoutATime) {
    LogLedger ledger;
    ledger.noteTime('1');
    ledger.noteTime(' ');
    ledger.noteTime(' ');
    EXPECT_EQ(ledger.withoutTime(), 2);
}

TEST(LogLedger, KeepsTheLatestLinesOldestFirst) {
    LogLedger ledger;
    std::vector<std::string> expected;
    for (int i = 0; i < 20; ++i) {
        const std::string line = "line " + std::to_string(i);
        ledger.noteRejected((line + "\n").c_str());
        if (i >= 20 - static_cast<int>(LogLedger::mostKept)) {
            expected.push_back(line);
        }
    }
    EXPECT_EQ(rejectedBy(ledger), expected);
}

TEST(LogLedger, KeepsTheLongestPieceOfALineWhole) {
    LogLedger ledger;
    ledger.noteRejected("");
    ledger.noteRejected("\n");
    ledger.noteRejected(std::string(2047, 'x').c_str());
    ledger.noteRejected((std::string(2046, 'y') + "\n").c_str());
    EXPECT_THAT(rejectedBy(ledger),
                ElementsAre("", "", std::string(2047, 'x'), std::string(2046, 'y')));
}

TEST(LogLedger, KeepsTheLatestRangesAndCountsAll) {
    const std::time_t before = now().tv_sec;
    LogLedger ledger;
    for (int i = 1; i <= 20; ++i) {
        ledger.noteTruncated(LogLedger::Truncation::seen, i, i == 20 ? 100 : -1);
    }
    EXPECT_EQ(ledger.truncations(), 20);
    EXPECT_EQ(ledger.skippedBytes(), 310) << "includes the unread end where it is known";
    const auto ranges = skippedBy(ledger);
    ASSERT_THAT(ranges, SizeIs(LogLedger::mostKept));
    EXPECT_EQ(ranges.front().from, 0);
    EXPECT_EQ(ranges.front().to, 5);
    EXPECT_EQ(ranges.back().to, 20);
    EXPECT_EQ(ranges.front().unread, -1);
    EXPECT_EQ(ranges.back().unread, 100);
    EXPECT_GE(ranges.back().time.tv_sec, before);
    EXPECT_LE(ranges.back().time.tv_sec, now().tv_sec);
}

TEST(LogLedger, IsReadWhileItIsWritten) {
    LogLedger ledger;
    std::atomic<bool> ends{false};
    std::thread writer([&] {
        for (int i = 0; i < 2000; ++i) {
            ledger.addBytes(10);
            ledger.noteEntries();
            ledger.noteRejected("a line\n");
            ledger.noteTruncated(LogLedger::Truncation::seen, 3, -1);
            ledger.noteStart();
        }
        ends = true;
    });
    while (!ends) {
        for (const std::string& line : rejectedBy(ledger)) {
            ASSERT_EQ(line, "a line");
        }
        for (const LogLedger::SkippedRange& range : skippedBy(ledger)) {
            ASSERT_EQ(range.to, 3);
        }
        ASSERT_EQ(ledger.bytesRead() % 10, 0);
    }
    writer.join();
    EXPECT_EQ(ledger.bytesRead(), 20000);
    EXPECT_EQ(ledger.truncations(), 2000);
    EXPECT_EQ(ledger.restarts(), 1999);
}

/// The ledger of a log that is followed on the test's own thread.
class LedgerOfALog : public MonitoredFile {
protected:
    LedgerOfALog() { m_log.openLogAndSeek(); }
    ~LedgerOfALog() override { m_log.closeLog(); }
    /// Follows the log until this many lines have been read.
    void followTo(std::size_t lines) {
        m_log.onLine = [this, lines](const std::string&) {
            if (m_log.lines.size() >= lines) {
                m_log.setMonitorStatus(MONITOR_STOPPED);
            }
        };
        m_log.follow();
    }

    TestLog m_log{*m_line};
    const LogLedger& m_ledger = m_log.ledger();
};

TEST_F(LedgerOfALog, CountsTheBytesThatWereRead) {
    append("one\ntwo\n");
    followTo(2);
    EXPECT_EQ(m_ledger.bytesRead(), 8);
    append("three");
    followTo(3);
    EXPECT_EQ(m_ledger.bytesRead(), 13);
}

TEST_F(LedgerOfALog, KeepsTheLinesThatDoNotMatch) {
    append("one\nbad\ntwo\nbad again\n");
    followTo(4);
    EXPECT_THAT(rejectedBy(m_ledger), ElementsAre("bad", "bad again"));
}

TEST_F(LedgerOfALog, RecordsTheTimeOfTheLastEntry) {
    const std::time_t before = now().tv_sec;
    append("one\n");
    followTo(1);
    EXPECT_GE(m_ledger.lastEntry() / 1'000'000'000, before);
    EXPECT_LE(m_ledger.lastEntry() / 1'000'000'000, now().tv_sec);
}

TEST_F(LedgerOfALog, RecordsTheBytesThatATruncationSkips) {
    append("one\ntwo\n");
    followTo(2);
    std::filesystem::resize_file(m_path, 4);
    RecordingTrace trace(TRC1_ERROR);
    std::thread follower([this] { m_log.follow(); });
    EXPECT_TRUE(waitUntil([this] { return m_ledger.truncations() == 1; }));
    m_log.setMonitorStatus(MONITOR_STOPPED);
    follower.join();
    EXPECT_EQ(m_ledger.skippedBytes(), 4);
    const auto ranges = skippedBy(m_ledger);
    ASSERT_THAT(ranges, SizeIs(1));
    EXPECT_EQ(ranges[0].from, 0);
    EXPECT_EQ(ranges[0].to, 4);
    append("new\n");
    followTo(3);
    EXPECT_EQ(m_ledger.bytesRead(), 12);
}

TEST_F(MonitoredFile, ALedgerSurvivesARefreshThatRestartsTheMonitor) {
    TestLog log(*m_line);
    log.startThread();
    ASSERT_TRUE(waitUntil([&log] { return log.eof() == 0; }));
    append("one\nbad\n");
    ASSERT_TRUE(waitUntil([&log] { return log.ledger().bytesRead() == 8; }));
    EXPECT_EQ(log.ledger().restarts(), 0);
    log = *m_line;
    EXPECT_EQ(log.ledger().restarts(), 0) << "a running monitor is not restarted";
    log.setMonitorStatus(MONITOR_ERR_READ);
    log = *m_line;
    EXPECT_EQ(log.ledger().restarts(), 1);
    EXPECT_EQ(log.ledger().bytesRead(), 8);
    EXPECT_THAT(rejectedBy(log.ledger()), ElementsAre("bad"));
}

TEST(LogLedger, CountsTheShapesOfRejectedLinesThatAreNotKept) {
    LogLedger ledger;
    for (int i = 0; i < 100; ++i) {
        ledger.noteRejected(("number " + std::to_string(i) + "\n").c_str());
    }
    ledger.noteRejected("- other\n");
    ledger.noteRejected(""); // a record
    LineShapes::Shape shapes[LineShapes::mostKept];
    ASSERT_EQ(ledger.copyShapes(shapes), 2U);
    EXPECT_EQ(shapes[0].view(), "a 9");
    EXPECT_EQ(shapes[0].count, 100);
    EXPECT_EQ(shapes[1].view(), "- a");
    EXPECT_EQ(shapes[1].count, 1);
}

} // namespace
