#include "SyslogTest.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <cstring>
#include <random>
#include <vector>

using namespace zrm;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;

class SyslogLine : public SyslogTest {
protected:
    /// The row of a line, built in a record full of garbage.
    zrm_rmlogent_data_t rowOf(std::string line) {
        zrm_rmlogent_data_t row;
        std::memset(&row, '#', sizeof row);
        EXPECT_EQ(m_log->formatEntryAsRow(line.data(), &row, nullptr), 0);
        return row;
    }
    std::string timeOf(const std::string& line) { return columnText(rowOf(line).entrytime); }

    void expectNothingTaken(const zrm_rmlogent_data_t& row) {
        EXPECT_EQ(columnText(row.entrytime), "");
        EXPECT_EQ(columnText(row.entrysys), "");
        EXPECT_EQ(columnText(row.entrysrc), "");
        EXPECT_EQ(columnText(row.entrydesc), "");
        EXPECT_EQ(columnText(row.uentrysrc), "");
        EXPECT_EQ(columnText(row.uentrydesc), "");
        EXPECT_EQ(columnText(row.logname), "messages");
    }
};

TEST_F(SyslogLine, FillsEveryColumn) {
    const auto row = rowOf("Oct  5 07:03:09 web1 sshd[412]: Failed password for root\n");
    EXPECT_EQ(columnText(row.originnode), "web1:ZRM");
    EXPECT_EQ(columnText(row.logpath), m_directory.path().string() + "/");
    EXPECT_EQ(columnText(row.logname), "messages");
    EXPECT_EQ(columnText(row.entrytime), "1061005070309000");
    EXPECT_EQ(columnText(row.entrysys), "web1");
    EXPECT_EQ(columnText(row.entrysrc), "sshd[412]");
    EXPECT_EQ(columnText(row.entrytype), "");
    EXPECT_EQ(columnText(row.entryclass), "");
    EXPECT_EQ(columnText(row.entrydesc), "Failed password for root");
    EXPECT_EQ(row.freqthresh, 0);
    EXPECT_EQ(row.periodthrs, 0);
    EXPECT_EQ(columnText(row.timestamp), "1061005120000000");
    EXPECT_EQ(row.sampleno, 0);
    EXPECT_EQ(row.rowno, 0);
    EXPECT_EQ(columnText(row.ulogpath), m_directory.path().string() + "/");
    EXPECT_EQ(columnText(row.ulogname), "messages");
    EXPECT_EQ(columnText(row.uentrysrc), "sshd[412]");
    EXPECT_EQ(columnText(row.uentrydesc), "Failed password for root");
    const std::string_view bytes(reinterpret_cast<const char*>(&row), sizeof row);
    EXPECT_EQ(std::count(bytes.begin(), bytes.end(), '#'), 0);
}

TEST_F(SyslogLine, TakesTheTimeFromItsFixedPositions) {
    EXPECT_EQ(timeOf("Oct 15 23:59:58 h s: d\n"), "1061015235958000");
    EXPECT_EQ(timeOf("Oct x5 ab cd ef h s: d\n"), "10610x5abcdef000");
    EXPECT_EQ(timeOf("Octa 5b07c03d09e h s: d\n"), "1061005070309000");
}

TEST_F(SyslogLine, TheYearIsTheClocks) {
    m_clock.set(946684800); // 2000
    EXPECT_EQ(timeOf("Oct  5 07:03:09 h s: d\n"), "1001005070309000");
    m_clock.set(946684799); // 1999
    EXPECT_EQ(timeOf("Oct  5 07:03:09 h s: d\n"), "0991005070309000");
}

TEST_F(SyslogLine, KnowsTheTwelveMonths) {
    const char* const names[] = {"Jan", "Feb", "Mar", "Apr", "May", "Jun",
                                 "Jul", "Aug", "Sep", "Oct", "Nov", "Dec"};
    for (int month = 1; month <= 12; ++month) {
        const std::string number = (month < 10 ? "0" : "") + std::to_string(month);
        EXPECT_EQ(timeOf(std::string(names[month - 1]) + "  5 07:03:09 h s: d\n"),
                  "106" + number + "05070309000");
    }
}

TEST_F(SyslogLine, WithoutAMonthTheRowHasNothingOfTheLine) {
    for (const char* month : {"anF", "ebM", "jan", "JAN", "   ", "Xyz", "cJa"}) {
        SCOPED_TRACE(month);
        expectNothingTaken(rowOf(std::string(month) + "  5 07:03:09 host src: text\n"));
    }
}

TEST_F(SyslogLine, TooShortForItsTimeIsLikeOneWithoutAMonth) {
    const std::string whole = "Oct  5 07:03:09";
    for (std::size_t length = 0; length < whole.size(); ++length) {
        SCOPED_TRACE(length);
        expectNothingTaken(rowOf(whole.substr(0, length)));
        expectNothingTaken(rowOf(whole.substr(0, length) + "\n"));
    }
    // A NUL byte is a line's end too.
    expectNothingTaken(rowOf(std::string("Oct  5 07:0\0:09 host src: text\n", 32)));
}

TEST_F(SyslogLine, MayEndAfterItsTime) {
    for (const char* end : {"", "\n", " ", " \n"}) {
        const auto row = rowOf(std::string("Oct  5 07:03:09") + end);
        EXPECT_EQ(columnText(row.entrytime), "1061005070309000");
        EXPECT_EQ(columnText(row.entrysys), "");
        EXPECT_EQ(columnText(row.entrysrc), "");
        EXPECT_EQ(columnText(row.entrydesc), "");
    }
}

TEST_F(SyslogLine, MayEndInAnyField) {
    auto row = rowOf("Oct  5 07:03:09 host");
    EXPECT_EQ(columnText(row.entrysys), "host");
    EXPECT_EQ(columnText(row.entrysrc), "");
    EXPECT_EQ(columnText(row.entrydesc), "");
    row = rowOf("Oct  5 07:03:09 host src");
    EXPECT_EQ(columnText(row.entrysrc), "src");
    EXPECT_EQ(columnText(row.entrydesc), "");
    row = rowOf("Oct  5 07:03:09 host src:");
    EXPECT_EQ(columnText(row.entrysrc), "src");
    EXPECT_EQ(columnText(row.entrydesc), "");
    row = rowOf("Oct  5 07:03:09 host src:\n");
    EXPECT_EQ(columnText(row.entrysrc), "src");
    EXPECT_EQ(columnText(row.entrydesc), "");
    row = rowOf("Oct  5 07:03:09 host src: \n");
    EXPECT_EQ(columnText(row.entrydesc), "");
}

TEST_F(SyslogLine, TheSourceEndsAtAColonOrAtWhiteSpace) {
    auto row = rowOf("Oct  5 07:03:09 host kernel text: more\n");
    EXPECT_EQ(columnText(row.entrysrc), "kernel");
    EXPECT_EQ(columnText(row.entrydesc), "text: more");
    row = rowOf("Oct  5 07:03:09 host\tcron\ttext\n");
    EXPECT_EQ(columnText(row.entrysys), "host");
    EXPECT_EQ(columnText(row.entrysrc), "cron");
    EXPECT_EQ(columnText(row.entrydesc), "text");
    row = rowOf("Oct  5 07:03:09 host a::b\n"); // two characters after the first colon
    EXPECT_EQ(columnText(row.entrysrc), "a");
    EXPECT_EQ(columnText(row.entrydesc), "b");
    row = rowOf("Oct  5 07:03:09 host : text\n");
    EXPECT_EQ(columnText(row.entrysrc), "");
    EXPECT_EQ(columnText(row.entrydesc), "text");
}

TEST_F(SyslogLine, ARepeatNoticeIsAllDescription) {
    auto row = rowOf("Oct  5 07:03:09 host last message repeated 3 times\n");
    EXPECT_EQ(columnText(row.entrysys), "host");
    EXPECT_EQ(columnText(row.entrysrc), "");
    EXPECT_EQ(columnText(row.uentrysrc), "");
    EXPECT_EQ(columnText(row.entrydesc), "last message repeated 3 times");
    row = rowOf("Oct  5 07:03:09 host last message repeats\n");
    EXPECT_EQ(columnText(row.entrysrc), "last");
    EXPECT_EQ(columnText(row.entrydesc), "message repeats");
}

TEST_F(SyslogLine, TheDescriptionIsCutAtItsWidth) {
    const std::string text(400, 'd');
    for (const std::size_t length : {0UL, 1UL, 255UL, 256UL, 257UL, 400UL}) {
        const auto row = rowOf("Oct  5 07:03:09 h s: " + text.substr(0, length) + "\n");
        const std::string expected = text.substr(0, std::min<std::size_t>(length, 256));
        EXPECT_EQ(columnText(row.entrydesc), expected);
        EXPECT_EQ(columnText(row.uentrydesc), expected);
        EXPECT_EQ(row.freqthresh, 0);
    }
}

TEST_F(SyslogLine, ADescriptionWithoutANewlineLosesItsLastByte) {
    EXPECT_EQ(columnText(rowOf("Oct  5 07:03:09 h s: text").entrydesc), "tex");
    EXPECT_EQ(columnText(rowOf("Oct  5 07:03:09 h s: t").entrydesc), "");
    const std::string full = "Oct  5 07:03:09 h s: " + std::string(257, 'd');
    EXPECT_EQ(columnText(rowOf(full).entrydesc), std::string(256, 'd'));
}

TEST_F(SyslogLine, FieldsOfTheirWidthFit) {
    const auto row =
        rowOf("Oct  5 07:03:09 " + std::string(32, 'h') + " " + std::string(32, 's') + ": text\n");
    EXPECT_EQ(columnText(row.entrysys), std::string(32, 'h'));
    EXPECT_EQ(columnText(row.entrysrc), std::string(32, 's'));
    EXPECT_EQ(columnText(row.uentrysrc), std::string(32, 's'));
    EXPECT_EQ(columnText(row.entrytype), "");
    EXPECT_EQ(columnText(row.entrydesc), "text");
}

TEST_F(SyslogLine, ALongHostLosesOneCharacterAndRunsOn) {
    const std::string host = std::string(32, 'h') + "x" + "overrun";
    auto row = rowOf("Oct  5 07:03:09 " + host.substr(0, 33) + " s: text\n");
    EXPECT_EQ(columnText(row.entrysys), std::string(32, 'h'));
    EXPECT_EQ(columnText(row.entrysrc), "s");
    row = rowOf("Oct  5 07:03:09 " + host + " s: text\n");
    EXPECT_EQ(columnText(row.entrysys), std::string(32, 'h'));
    EXPECT_EQ(columnText(row.entrysrc), "sverrun"); // the source overwrites it
    EXPECT_EQ(columnText(row.uentrysrc), "sverrun");
    EXPECT_EQ(columnText(row.entrydesc), "text");
}

TEST_F(SyslogLine, ALongSourceLosesOneCharacterAndRunsOn) {
    const std::string source = std::string(32, 's') + "x" + std::string(16, 't') +
                               std::string(16, 'c') + std::string(10, 'd');
    const auto row = rowOf("Oct  5 07:03:09 h " + source + ": text\n");
    EXPECT_EQ(columnText(row.entrysrc), std::string(32, 's'));
    EXPECT_EQ(columnText(row.uentrysrc), std::string(32, 's'));
    EXPECT_EQ(columnText(row.entrytype), std::string(16, 't'));
    EXPECT_EQ(columnText(row.entryclass), std::string(16, 'c'));
    EXPECT_EQ(columnText(row.entrydesc), "textdddddd");
}

TEST_F(SyslogLine, AFieldThatRunsOnIsOverwrittenByTheCommonColumns) {
    const auto row = rowOf("Oct  5 07:03:09 " + std::string(1000, 'h') + " s: text\n");
    EXPECT_EQ(columnText(row.timestamp), "1061005120000000");
    EXPECT_EQ(row.freqthresh, 0);
    EXPECT_EQ(row.rowno, 0);
    const std::string path = m_directory.path().string() + "/";
    EXPECT_EQ(std::string(row.ulogpath, path.size() + 1), path + "h");
}

TEST_F(SyslogLine, AFieldThatReachesTheCommonColumnsLeavesThemIntact) {
    for (std::size_t length = 300; length < 400; ++length) {
        const std::string field(length, 'x');
        for (const std::string& header : {field + " ", " " + field + ": ", "h " + field + ": "}) {
            const auto row = rowOf("Oct  5 07:03:09 " + header + "text\n");
            ASSERT_EQ(row.freqthresh, 0) << header;
            ASSERT_EQ(row.periodthrs, 0) << header;
            ASSERT_EQ(columnText(row.timestamp), "1061005120000000") << header;
        }
    }
}

TEST_F(SyslogLine, NoFieldRunsPastTheRow) {
    for (const char* line : {"Oct  5 07:03:09 ", "Oct  5 07:03:09 h "}) {
        const auto room = std::make_unique<char[]>(sizeof(zrm_rmlogent_data_t) + 64);
        std::memset(room.get(), '#', sizeof(zrm_rmlogent_data_t) + 64);
        std::string text = line + std::string(20000, 'x') + " s: text\n";
        EXPECT_EQ(m_log->formatEntryAsRow(text.data(), room.get(), nullptr), 0);
        EXPECT_EQ(room[sizeof(zrm_rmlogent_data_t) - 1], 'x');
        EXPECT_EQ(std::string(room.get() + sizeof(zrm_rmlogent_data_t), 64), std::string(64, '#'));
    }
}

TEST_F(SyslogLine, DescriptionAndSourceAreConvertedToUTF8) {
    const std::string umlauts(300, '\xFC');
    LocaleDouble::reset();
    const auto row = rowOf("Oct  5 07:03:09 h s\xE4: " + umlauts + "\n");
    EXPECT_EQ(columnText(row.entrysrc), "s\xE4");
    EXPECT_EQ(columnText(row.uentrysrc), "s\xC3\xA4");
    EXPECT_EQ(columnText(row.entrydesc), umlauts.substr(0, 256));
    std::string expected;
    for (int i = 0; i < 256; ++i) {
        expected += "\xC3\xBC";
    }
    EXPECT_EQ(columnText(row.uentrydesc), expected);
    const auto translations = LocaleDouble::translations();
    ASSERT_THAT(translations, SizeIs(2));
    EXPECT_EQ(translations[0].source, "s\xE4" + std::string(30, ' '));
    EXPECT_EQ(translations[0].targetSize, 96U);
    EXPECT_EQ(translations[0].flags, LOC2_NO_TERMINATOR);
    EXPECT_EQ(translations[1].source, umlauts.substr(0, 256));
    EXPECT_EQ(translations[1].targetSize, 768U);
    EXPECT_EQ(translations[1].flags, LOC2_NO_TERMINATOR);
}

TEST_F(SyslogLine, WithoutACodePageTheUTF8ColumnsAreBlank) {
    LocaleDouble::setCodePage(0);
    const auto row = rowOf("Oct  5 07:03:09 h s: text\n");
    EXPECT_EQ(columnText(row.entrydesc), "text");
    EXPECT_EQ(columnText(row.uentrysrc), "");
    EXPECT_EQ(columnText(row.uentrydesc), "");
    EXPECT_EQ(columnText(row.ulogname), "messages");
}

TEST(SysLogFileMonitor, RunsFromConstructionToDestruction) {
    LocaleDouble::reset();
    EventRecorder::clear();
    const TemporaryDirectory directory;
    const std::string path = directory.write("messages", "Oct  5 07:03:09 h s: before\n");
    RecordingTrace trace(TRC1_DETAIL);
    const auto dumps = [&] {
        const auto messages = trace.messages();
        return std::count_if(messages.begin(), messages.end(), [](const std::string& text) {
            return text.compare(0, 14, "\n\tRefreshMode\t") == 0;
        });
    };
    {
        SysLogFile log(*validLog(path), nullptr);
        EXPECT_EQ(log.monitorStatus(), MONITOR_RUNNING);
        EXPECT_EQ(dumps(), 1);
        EXPECT_TRUE(trace.waitFor("Thread successfully started for log file " + path + "."));
        // A line appended before the log is opened counts as already present.
        std::size_t appended = 0;
        while (EventRecorder::rows().empty() && appended < 100) {
            directory.append("messages",
                             "Oct  5 07:03:10 h s: after " + std::to_string(++appended) + "\n");
            EventRecorder::waitForRows(1, 2);
        }
        const auto rows = EventRecorder::rows();
        ASSERT_FALSE(rows.empty());
        EXPECT_THAT(columnText(rows[0].entrydesc), testing::StartsWith("after "));
        EXPECT_EQ(columnText(rows[0].logname), "messages");
        {
            const Fault waits("select", 0, {.times = 0});
            log.stopThread();
            EXPECT_LE(waits.calls(), 1);
        }
        EXPECT_EQ(log.monitorStatus(), MONITOR_STOPPED);
    }
    EXPECT_EQ(dumps(), 1); // a log left open would be dumped at its thread's end
    EXPECT_EQ(trace.count("Thread for log file " + path + " terminating."), 1);
    EXPECT_EQ(trace.count("Mutex destroyed for " + path + "."), 1);
}

class SysLogFileRows : public SyslogTest {
protected:
    /// Appends lines until the monitor reports one, which shows that it follows the file.
    void awaitMonitor() {
        for (int i = 0; i < 100 && EventRecorder::rows().empty(); ++i) {
            m_directory.append("followed", "no month\n");
            EventRecorder::waitForRows(1, 2);
        }
        ASSERT_FALSE(EventRecorder::rows().empty());
        EventRecorder::clear();
    }
    std::string field(std::size_t longest) {
        return std::string(m_random() % longest, static_cast<char>('a' + m_random() % 26));
    }
    std::string someLine() {
        switch (m_random() % 6) {
        case 0:
            return field(40) + "\n";
        case 1:
            return "Oct  5 07:03:09 " + field(600) + " " + field(100) + ": text\n";
        case 2:
            return "Oct  5 07:03:09 " + field(20) + " " + field(600) + ": " + field(300) + "\n";
        default:
            return "Oct  5 07:03:09 " + field(20) + " " + field(20) + ": " + field(300) + "\n";
        }
    }

    const unsigned m_seed = std::random_device{}();
    std::mt19937 m_random{m_seed};
};

TEST_F(SysLogFileRows, OfAMonitorEqualThoseBuiltOneByOne) {
    SCOPED_TRACE("seed " + std::to_string(m_seed));
    m_directory.write("followed", "");
    SysLogFile log(*validLog(m_directory.file("followed")), nullptr);
    awaitMonitor();
    EventRecorder::writeThresholds();
    std::vector<std::string> lines(3000);
    std::string content;
    for (std::string& line : lines) {
        content += line = someLine();
    }
    m_directory.append("followed", content);
    const auto rows = EventRecorder::waitForRows(lines.size());
    log.stopThread();
    ASSERT_THAT(rows, SizeIs(lines.size()));
    for (std::size_t i = 0; i < lines.size(); ++i) {
        zrm_rmlogent_data_t alone;
        std::memset(&alone, '#', sizeof alone);
        log.formatEntryAsRow(lines[i].data(), &alone, nullptr);
        ASSERT_EQ(std::memcmp(&rows[i], &alone, sizeof alone), 0) << lines[i];
    }
}

TEST(SysLogFileMonitor, ALogThatCannotBeOpenedEndsTheThread) {
    LocaleDouble::reset();
    const TemporaryDirectory directory;
    const std::string path = directory.write("messages", "");
    RecordingTrace trace(TRC1_ERROR);
    const Fault fault("open", ENOENT);
    SysLogFile log(*validLog(path), nullptr);
    log.stopThread();
    EXPECT_EQ(log.monitorStatus(), MONITOR_ERR_OPEN);
    EXPECT_THAT(trace.messages(), ElementsAre("Error opening file " + path +
                                              ".  errno = 2; No such file or directory"));
}

} // namespace
