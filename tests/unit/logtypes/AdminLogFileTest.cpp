#include "logtypes/AdminLogFile.h"

#include "AccountingRecords.h"
#include "LogTypeTest.h"
#include "support/TestValidLog.h"
#include "support/TimeZone.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <algorithm>
#include <cerrno>
#include <map>
#include <memory>
#include <random>

#include <unistd.h>

using namespace zrm;

namespace {

using testing::ElementsAre;

constexpr std::int64_t oneMoment = 1159930989; // 4 October 2006 03:03:09 UTC

/// What a row must hold, rendered without the product's help.
std::string expectedDescription(const AccountingRecord& record) {
    const auto cut = [](const std::string& text, std::size_t width) {
        return std::string(text.c_str()).substr(0, width);
    };
    return "user = " + cut(record.user, 8) + "; id = " + cut(record.id, 4) +
           "; pid = " + std::to_string(record.pid) +
           "; term status = " + std::to_string(record.termination) +
           "; exit status = " + std::to_string(record.exit);
}

std::string expectedType(int type) {
    static const std::map<int, std::string> texts = {
        {0, "Unused space"},   {1, "Run level"},    {2, "System boot time"}, {3, "User logon time"},
        {4, "User idle time"}, {5, "init process"}, {6, "getty waiting"},    {7, "User process"},
        {8, "Zombie process"}, {9, "Accounting"},
    };
    const auto found = texts.find(type);
    return found != texts.end() ? found->second : "Unknown";
}

std::string expectedTime(std::int64_t time) {
    const std::time_t seconds = time;
    std::tm parts{};
    gmtime_r(&seconds, &parts);
    char text[32];
    std::strftime(text, sizeof text, "%y%m%d%H%M%S000", &parts);
    return (parts.tm_year < 100 ? "0" : "1") + std::string(text);
}

std::string latin1ToUtf8(const std::string& text) {
    std::string result;
    for (const char character : text) {
        const auto code = static_cast<unsigned char>(character);
        if (code < 0x80) {
            result += character;
        } else {
            result += static_cast<char>(0xC0 | (code >> 6));
            result += static_cast<char>(0x80 | (code & 0x3F));
        }
    }
    return result;
}

std::string padded(std::string text, std::size_t width) {
    text.resize(width, ' ');
    return text;
}

class AdminLogFileTest : public LogTypeTest {
protected:
    std::unique_ptr<AdminLogFile> start() {
        return std::make_unique<AdminLogFile>(*validLog(log, " ;N ;A"), nullptr);
    }
    /// Starts a monitor and waits until it follows the file.
    std::unique_ptr<AdminLogFile> startAndFollow() {
        auto monitor = start();
        // The loop checks the size of the file before its first wait.
        EXPECT_TRUE(waitUntil([&] { return polling.calls() > 0; }));
        return monitor;
    }
    void append(const std::string& bytes) const { directory.append("wtmp", bytes); }

    static void expectRow(const zrm_rmlogent_data_t& row, const AccountingRecord& record,
                          const std::string& directoryName) {
        const std::string source(std::string(record.line.c_str()).substr(0, 12));
        const std::string description = expectedDescription(record);
        const auto whole = [](const auto& column) { return std::string(column, sizeof column); };
        EXPECT_EQ(whole(row.originnode), padded("web1:ZRM", 64));
        EXPECT_EQ(whole(row.logpath), padded(directoryName, 256));
        EXPECT_EQ(whole(row.logname), padded("wtmp", 128));
        EXPECT_EQ(whole(row.entrytime), expectedTime(record.time));
        EXPECT_EQ(whole(row.entrysys), padded("", 32));
        EXPECT_EQ(whole(row.entrysrc), padded(source, 32));
        EXPECT_EQ(whole(row.entrytype), padded(expectedType(record.type), 16));
        EXPECT_EQ(whole(row.entryclass), padded("", 16));
        EXPECT_EQ(whole(row.entrydesc), padded(description, 256));
        EXPECT_EQ(row.freqthresh, 0);
        EXPECT_EQ(row.periodthrs, 0);
        EXPECT_EQ(row.sampleno, 0);
        EXPECT_EQ(row.rowno, 0);
        EXPECT_EQ(whole(row.ulogpath), padded(directoryName, 768));
        EXPECT_EQ(whole(row.ulogname), padded("wtmp", 384));
        EXPECT_EQ(whole(row.uentrysrc), padded(latin1ToUtf8(source), 96));
        EXPECT_EQ(whole(row.uentrydesc), padded(latin1ToUtf8(description), 768));
    }

    const TimeZone zone{"UTC0"};
    const std::string log = directory.write("wtmp", AccountingRecord{.user = "before"}.bytes());
    const std::string directoryName = directory.path().string() + "/";
    const AccountingRecord root{.user = "root",
                                .id = "ts/1",
                                .line = "pts/1",
                                .pid = 4711,
                                .type = 7,
                                .termination = 0,
                                .exit = 1,
                                .time = oneMoment};

    // Counts the loop's checks of the file: each ends with a wait.
    const Fault polling{"select", 0, {.times = 0}};
    const ShortSelect shortSelect;
};

TEST_F(AdminLogFileTest, ReportsAppendedRecordsOnlyAndCopiesThemToTheDebugLog) {
    const auto monitor = startAndFollow();
    EXPECT_EQ(monitor->monitorStatus(), MONITOR_RUNNING);
    append(root.bytes());
    AccountingRecord second = root;
    second.user = "eightlet";
    second.type = 3;
    second.pid = -2;
    second.time += 60;
    append(second.bytes());
    const auto rows = EventRecorder::waitForRows(2);
    ASSERT_EQ(rows.size(), 2U);
    expectRow(rows[0], root, directoryName);
    expectRow(rows[1], second, directoryName);
    EXPECT_EQ(columnText(rows[1].entrydesc),
              "user = eightlet; id = ts/1; pid = -2; term status = 0; exit status = 1");
    EXPECT_EQ(columnText(rows[1].entrytype), "User logon time");

    const auto copies = DebugLogRecorder::waitForRecords(2);
    ASSERT_EQ(copies.size(), 2U);
    EXPECT_EQ(copies[0].entry, root.bytes());
    EXPECT_EQ(copies[0].row, std::string(reinterpret_cast<const char*>(&rows[0]), sizeof rows[0]));
    EXPECT_EQ(copies[1].entry, second.bytes());
    EXPECT_EQ(monitor->numEvents(), 2);
    EXPECT_EQ(monitor->numFormatErrors(), 0);
    EXPECT_THAT(trace.messages(), ElementsAre());
}

TEST_F(AdminLogFileTest, RendersRandomRecordsAsAnIndependentRenderingDoes) {
    std::mt19937_64 random(20061004);
    const auto number = [&](std::int64_t low, std::int64_t high) {
        return std::uniform_int_distribution<std::int64_t>(low, high)(random);
    };
    const auto text = [&](std::size_t width) {
        std::string result(static_cast<std::size_t>(number(0, static_cast<std::int64_t>(width))),
                           'x');
        for (char& character : result) {
            character = static_cast<char>(number(0, 20) == 0 ? 0 : number(1, 255));
        }
        return result;
    };
    std::vector<AccountingRecord> records;
    std::string bytes;
    // More than two blocks of the reader.
    for (int i = 0; i < 3000; ++i) {
        const auto number16 = [&] { return static_cast<std::int16_t>(number(-32768, 32767)); };
        records.push_back({.user = text(8),
                           .id = text(4),
                           .line = text(12),
                           .pid = number16(),
                           .type = static_cast<std::int16_t>(number(-2, 12)),
                           .termination = number16(),
                           .exit = number16(),
                           .time = number(-2000000000, 4000000000)});
        bytes += records.back().bytes();
    }
    const auto monitor = startAndFollow();
    for (std::size_t written = 0; written < bytes.size();) {
        const auto count = static_cast<std::size_t>(number(1, 700)) * 40;
        append(bytes.substr(written, count));
        written += count;
    }
    const auto rows = EventRecorder::waitForRows(records.size());
    ASSERT_EQ(rows.size(), records.size());
    for (std::size_t i = 0; i < rows.size() && !HasFailure(); ++i) {
        SCOPED_TRACE(i);
        expectRow(rows[i], records[i], directoryName);
    }
    EXPECT_EQ(monitor->numEvents(), 3000);
    EXPECT_THAT(trace.messages(), ElementsAre());
}

TEST_F(AdminLogFileTest, AnIncompleteRecordEndsTheMonitorAndARefreshRestartsIt) {
    const auto monitor = startAndFollow();
    append(root.bytes() + std::string(20, 'x'));
    ASSERT_TRUE(waitForStatus(*monitor, MONITOR_ERR_READ));
    EXPECT_EQ(statusText(*monitor), "Error: log read failed");
    EXPECT_EQ(EventRecorder::rows().size(), 1U);
    EXPECT_EQ(monitor->numEvents(), 1);
    EXPECT_THAT(trace.messages(), ElementsAre("Incomplete record read from file " + log +
                                              ". Bytes read = 20; bytes expected = 40"));

    // The bytes of the incomplete record are lost; the next byte starts a record.
    trace.clear();
    const int looks = polling.calls();
    static_cast<LogFile&>(*monitor) = *validLog(log, " ;N ;A");
    EXPECT_EQ(monitor->monitorStatus(), MONITOR_RUNNING);
    ASSERT_TRUE(waitUntil([&] { return polling.calls() > looks; }));
    append(root.bytes());
    ASSERT_EQ(EventRecorder::waitForRows(2).size(), 2U);
    expectRow(EventRecorder::rows()[1], root, directoryName);
    EXPECT_THAT(trace.messages(), ElementsAre());
}

// The reader takes many records at once, and finds the first part of the last one. By the time
// that record's turn comes its rest is there, as when every record is read by itself.
TEST_F(AdminLogFileTest, ARecordCompletedBeforeItsTurnIsWhole) {
    const auto monitor = startAndFollow();
    AccountingRecord split = root;
    split.user = "split";
    AccountingRecord last = root;
    last.user = "last";
    EventRecorder::onRow([&](std::size_t count) {
        if (count == 2) {
            append(split.bytes().substr(15) + last.bytes());
        }
    });
    append(root.bytes() + root.bytes() + split.bytes().substr(0, 15));
    const auto rows = EventRecorder::waitForRows(4);
    ASSERT_EQ(rows.size(), 4U);
    expectRow(rows[2], split, directoryName);
    expectRow(rows[3], last, directoryName);
    EXPECT_EQ(monitor->monitorStatus(), MONITOR_RUNNING);
    EXPECT_THAT(trace.messages(), ElementsAre());
}

TEST_F(AdminLogFileTest, APartialRecordThatGrewBeforeItsTurnIsStillIncomplete) {
    const auto monitor = startAndFollow();
    EventRecorder::onRow([&](std::size_t count) {
        if (count == 1) {
            append(std::string(24, 'y'));
        }
    });
    append(root.bytes() + std::string(15, 'x'));
    ASSERT_TRUE(waitForStatus(*monitor, MONITOR_ERR_READ));
    EXPECT_THAT(trace.messages(), ElementsAre("Incomplete record read from file " + log +
                                              ". Bytes read = 39; bytes expected = 40"));
}

TEST_F(AdminLogFileTest, AFailedReadEndsTheMonitor) {
    const auto monitor = startAndFollow();
    const Fault fault("read", EIO);
    append(root.bytes());
    ASSERT_TRUE(waitForStatus(*monitor, MONITOR_ERR_READ));
    EXPECT_THAT(trace.messages(), ElementsAre("Error occurred reading file " + log +
                                              ".  errno = 5; Input/output error"));
    EXPECT_THAT(EventRecorder::rows(), testing::IsEmpty());
}

TEST_F(AdminLogFileTest, AFailedReadAfterSomeRecordsKeepsThem) {
    const auto monitor = startAndFollow();
    const Fault fault("read", EIO, {.skip = 1});
    append(root.bytes());
    ASSERT_TRUE(waitForStatus(*monitor, MONITOR_ERR_READ));
    EXPECT_THAT(trace.messages(), ElementsAre("Error occurred reading file " + log +
                                              ".  errno = 5; Input/output error"));
    EXPECT_EQ(EventRecorder::rows().size(), 1U);
}

TEST_F(AdminLogFileTest, AFileThatCannotBeOpenedEndsTheMonitor) {
    const auto line = validLog(log, " ;N ;A");
    unlink(log.c_str());
    const AdminLogFile monitor(*line, nullptr);
    ASSERT_TRUE(waitForStatus(monitor, MONITOR_ERR_OPEN));
    EXPECT_EQ(statusText(monitor), "Error: log open failed");
    EXPECT_THAT(trace.messages(), ElementsAre("Error opening file " + log +
                                              ". errno = 2; No such file or directory"));
}

TEST_F(AdminLogFileTest, AFailedSeekToTheEndEndsTheMonitor) {
    const Fault fault("lseek", EOVERFLOW);
    const auto monitor = start();
    ASSERT_TRUE(waitForStatus(*monitor, MONITOR_ERR_SEEK_EOF));
    EXPECT_EQ(statusText(*monitor), "Error: seek for EOF failed");
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error while seeking EOF for file " + log +
                            ".  errno = 75; Value too large for defined data type"));
}

TEST_F(AdminLogFileTest, ATruncatedFileIsFollowedFromItsNewEnd) {
    append(root.bytes() + root.bytes());
    const auto monitor = startAndFollow();
    ASSERT_EQ(truncate(log.c_str(), 40), 0);
    ASSERT_TRUE(
        trace.waitFor("Warning: log file " + log + " truncated. Resetting EOF to offset 40."));
    append(root.bytes());
    EXPECT_EQ(EventRecorder::waitForRows(1).size(), 1U);
}

TEST_F(AdminLogFileTest, DumpsItselfAtTheStartWhenTheDetailClassIsOn) {
    trace.setLevel(TRC1_DETAIL);
    const auto monitor = start();
    const auto messages = trace.messages();
    EXPECT_TRUE(std::any_of(messages.begin(), messages.end(), [](const std::string& message) {
        return message.find("\tMonitorStatus\t\t= 0") != std::string::npos;
    }));
}

TEST_F(AdminLogFileTest, OtherProgramsDoNotInheritItsDescriptor) {
    const Fault opened("open", 0, {.times = 0});
    const auto monitor = startAndFollow();
    EXPECT_GE(opened.calls(), 1);
    EXPECT_THAT(openFilesOfAChild(), testing::Not(testing::HasSubstr("wtmp")));
}

TEST(AdminLogFileEntryType, HasATextForEveryTypeAndCutsItToTheRoom) {
    for (int type = -3; type < 15; ++type) {
        char column[20];
        std::memset(column, '.', sizeof column);
        AdminLogFile::fillEntryType(column, 16, type);
        EXPECT_EQ(std::string(column, sizeof column), [&] {
            std::string text = expectedType(type);
            text.resize(sizeof column, '.');
            return text;
        }());
    }
    char column[] = "....";
    AdminLogFile::fillEntryType(column, 3, 2);
    EXPECT_STREQ(column, "Sys.");
    AdminLogFile::fillEntryType(column, 0, 7);
    EXPECT_STREQ(column, "Sys.");
}

TEST(AdminLogFileDescription, IsCutToTheRoomInBothCodePages) {
    LocaleDouble::reset();
    AdminLogFile::utmp record{};
    const std::string bytes = AccountingRecord{.user = "j\xFCrgen", .id = "abcd"}.bytes();
    std::memcpy(&record, bytes.data(), sizeof record);
    char column[16];
    std::memset(column, '.', sizeof column);
    AdminLogFile::formatEntryDesc(column, 12, &record, 0);
    EXPECT_EQ(std::string(column, sizeof column), "user = j\xFCrge....");
    std::memset(column, '.', sizeof column);
    AdminLogFile::formatEntryDesc(column, 12, &record, 1);
    EXPECT_EQ(std::string(column, sizeof column), "user = j\xC3\xBCrg....");
}

} // namespace
