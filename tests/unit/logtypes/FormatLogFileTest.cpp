// Logs whose entries a format of the framework takes apart: rows, times, records, reports.

#include "logtypes/FormatLogFile.h"

#include "FakeFormat.h"
#include "LogTypeTest.h"
#include "framework/LogEntry.h"
#include "host/events/PositionBook.h"
#include "logs/FollowSettings.h"
#include "logs/FurtherLogs.h"
#include "logs/ValidLog.h"
#include "logtypes/EntryReader.h"
#include "logtypes/createLogFile.h"
#include "support/TimeZone.h"

#include <gmock/gmock.h>

#include <cerrno>
#include <future>
#include <memory>
#include <string>
#include <vector>

using namespace zrm::host;

namespace {

using testing::ElementsAre;

class FormatLogFileTest : public LogTypeTest {
protected:
    FormatLogFileTest() {
        PositionBook::makeCurrent(PositionBook::unkept());
        m_settings.start = FollowSettings::Start::beginning;
    }

    ValidLog line(std::size_t recordLength = 0) {
        m_settings.format.value = std::make_shared<FakeFormat>(recordLength);
        return ValidLog(FurtherLog{m_path, FormatLogFile::typeLetter, 'N', "",
                                   std::make_shared<const FollowSettings>(m_settings)});
    }
    std::unique_ptr<FormatLogFile> start(std::size_t recordLength = 0) {
        return std::make_unique<FormatLogFile>(line(recordLength), nullptr);
    }
    /// The rows of a log with this content.
    std::vector<zrm_rmlogent_data_t> rowsOf(const std::string& content, std::size_t count,
                                            std::size_t recordLength = 0) {
        directory.append("app.log", content);
        m_log = start(recordLength);
        return EventRecorder::waitForRows(count);
    }
    template <std::size_t width> static std::string stamp(const char (&column)[width]) {
        return {column, width};
    }

    const TimeZone zone{"UTC0"};
    FakeClock clock{1160049600}; // 5 October 2006, 12:00:00 UTC
    const std::string m_path = directory.write("app.log", "");
    FollowSettings m_settings;
    std::unique_ptr<FormatLogFile> m_log;
};

TEST_F(FormatLogFileTest, IsCreatedByItsLetterWhichNoLineOfTheLogConfigurationHas) {
    const ValidLog log = line();
    const std::unique_ptr<LogFile> created(createLogFile(log, nullptr));
    EXPECT_NE(dynamic_cast<FormatLogFile*>(created.get()), nullptr);
    std::string text = m_path + " ;N ;F";
    EXPECT_EQ(ValidLog(CONFIG_USER, text.data(), nullptr).type(), 'S');
}

TEST_F(FormatLogFileTest, FillsTheColumnsCutToTheirWidths) {
    const std::string wide(300, 'x');
    const auto rows = rowsOf("0703 web1|app[7]|ERROR|db|it broke\n"
                             "0704 " +
                                 wide + '|' + wide + '|' + wide + '|' + wide + '|' + wide + '\n',
                             2);
    ASSERT_EQ(rows.size(), 2U);
    EXPECT_EQ(columnText(rows[0].entrysys), "web1");
    EXPECT_EQ(columnText(rows[0].entrysrc), "app[7]");
    EXPECT_EQ(columnText(rows[0].uentrysrc), "app[7]");
    EXPECT_EQ(columnText(rows[0].entrytype), "ERROR");
    EXPECT_EQ(columnText(rows[0].entryclass), "db");
    EXPECT_EQ(columnText(rows[0].entrydesc), "it broke");
    EXPECT_EQ(columnText(rows[0].uentrydesc), "it broke");
    EXPECT_EQ(stamp(rows[0].entrytime), "1061005070300000");
    EXPECT_EQ(columnText(rows[1].entrysys), wide.substr(0, 32));
    EXPECT_EQ(columnText(rows[1].entrysrc), wide.substr(0, 32));
    EXPECT_EQ(columnText(rows[1].entrytype), wide.substr(0, 16));
    EXPECT_EQ(columnText(rows[1].entryclass), wide.substr(0, 16));
    EXPECT_EQ(columnText(rows[1].entrydesc), wide.substr(0, 256));
    EXPECT_EQ(rows[1].freqthresh, rows[0].freqthresh) << "nothing is written behind a column";
}

TEST_F(FormatLogFileTest, ALineThatIsLongerThanALineOfOtherLogsIsReadWhole) {
    const std::string system(3000, 's');
    const auto rows = rowsOf("0703 " + system + "|app|||behind it\n", 1);
    ASSERT_EQ(rows.size(), 1U);
    EXPECT_EQ(columnText(rows[0].entrydesc), "behind it");
}

TEST_F(FormatLogFileTest, TimesHaveTheYearOfTheClockUnlessTheySayOneAndHonourZones) {
    m_settings.timezone = "somewhere";
    m_settings.zone = {{INT64_MIN, 7200}};
    const auto rows = rowsOf("1100 a||||one\nY1100 a||||two\nZ1100 a||||three\n", 3);
    ASSERT_EQ(rows.size(), 3U);
    EXPECT_EQ(stamp(rows[0].entrytime), "1061005090000000");
    EXPECT_EQ(stamp(rows[1].entrytime), "1041005090000000");
    EXPECT_EQ(stamp(rows[2].entrytime), "1041005100000000");
}

TEST_F(FormatLogFileTest, AnEntryWithoutATimeHasThatOfReading) {
    const auto rows = rowsOf("a||||one\n", 1);
    ASSERT_EQ(rows.size(), 1U);
    EXPECT_EQ(stamp(rows[0].entrytime).substr(0, 13), "1061005120000");
}

TEST_F(FormatLogFileTest, AnEntryThatDoesNotFitIsKeptWithItsReason) {
    rowsOf("bad one\n0703 a||||good\n", 1);
    EXPECT_EQ(m_log->numFormatErrors(), 1);
    EXPECT_EQ(m_log->numEvents(), 2);
    LogLedger::RejectedLine lines[LogLedger::mostKept];
    ASSERT_EQ(m_log->ledger().copyRejected(lines), 1U);
    EXPECT_EQ(std::string(lines[0].text, lines[0].length), "bad one");
    EXPECT_STREQ(lines[0].reason, "it begins with bad");
}

/// Remembers what the entry of a row had beside it.
class SeenEntry {
public:
    SeenEntry() {
        EventRecorder::onRow([this](std::size_t) {
            m_all = *LogEntry::ofThisThread->fields().find("all");
            m_text = LogEntry::ofThisThread->text();
            m_isSeen.set_value();
        });
    }
    ~SeenEntry() { EventRecorder::onRow(nullptr); }
    SeenEntry(const SeenEntry&) = delete;
    SeenEntry& operator=(const SeenEntry&) = delete;

    void wait() { m_isSeen.get_future().wait(); }
    const std::string& all() const { return m_all; }
    const std::string& text() const { return m_text; }

private:
    std::promise<void> m_isSeen;
    std::string m_all;
    std::string m_text;
};

TEST_F(FormatLogFileTest, FieldsAreReadFromTheWholeEntry) {
    const std::string entry = "0703 a||||" + std::string(3000, 'd');
    SeenEntry seen;
    rowsOf(entry + "\r\n", 1);
    seen.wait();
    EXPECT_EQ(seen.all(), entry);
    EXPECT_EQ(seen.text(), entry);
}

TEST_F(FormatLogFileTest, ReadsRecordsWhichHaveFieldsButNoText) {
    SeenEntry seen;
    const std::string record = "0703 a|b|||\r";
    const auto rows = rowsOf("bad4567890\r\n" + record + "incomplete", 1, record.size());
    ASSERT_EQ(rows.size(), 1U);
    seen.wait();
    EXPECT_EQ(columnText(rows[0].entrysrc), "b");
    EXPECT_EQ(seen.all(), record);
    EXPECT_EQ(seen.text(), "");
    EXPECT_EQ(m_log->numFormatErrors(), 1);
}

class FormatReport : public FormatLogFileTest {
protected:
    std::vector<std::string> report(const char* from, const char* to) {
        _RequestThresholds thresholds = window(from, to);
        void* state = m_log->startReportRequest(&thresholds);
        std::vector<std::string> texts;
        zrm_rmlogent_data_t row;
        while (state != nullptr && m_log->getNextLogEntry(&row, state, &thresholds) != nullptr) {
            texts.push_back(columnText(row.entrydesc));
        }
        m_log->endReportRequest(&state);
        EXPECT_EQ(state, nullptr);
        return texts;
    }
};

TEST_F(FormatReport, GivesTheEntriesOfTheWindowNewestFirst) {
    rowsOf("0701 a||||one\n0702 a||||two\nbad\n0703 a||||three\n0704 a||||four\n", 4);
    EXPECT_THAT(report("1061005070200000", "1061005070300000"), ElementsAre("three", "two"));
    EXPECT_THAT(report("0000000000000000", "1991231235959999"),
                ElementsAre("four", "three", "two", "one"));
}

TEST_F(FormatReport, OfALogThatCannotBeReadDoesNotStart) {
    m_log = start();
    EXPECT_TRUE(report("0000000000000000", "1991231235959999").empty());
    directory.append("app.log", "0701 a||||one\n");
    const Fault fault("open", EACCES);
    EXPECT_TRUE(report("0000000000000000", "1991231235959999").empty());
}

TEST_F(FormatReport, AnEntryReaderGivesAnEntryWithoutATimeThatOfTheNewerOne) {
    m_log = start();
    const auto entries = EntryReader::of(*m_log);
    zrm_rmlogent_data_t row;
    char text[] = "a||||one";
    EXPECT_TRUE(entries->read(text, text, "1051231070000000", row));
    EXPECT_EQ(stamp(row.entrytime), "1051231070000000");
    char bad[] = "bad";
    EXPECT_FALSE(entries->read(bad, bad, "1051231070000000", row));
}

TEST(FollowSettings, AreEqualIfTheirFormatsHaveEqualDefinitions) {
    FollowSettings one;
    FollowSettings other;
    one.format.value = std::make_shared<FakeFormat>(0, "same");
    EXPECT_NE(one, other);
    other.format.value = std::make_shared<FakeFormat>(0, "same");
    EXPECT_EQ(one, other);
    other.format.value = std::make_shared<FakeFormat>(0, "different");
    EXPECT_NE(one, other);
}

} // namespace
