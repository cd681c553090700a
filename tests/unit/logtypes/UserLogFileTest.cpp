#include "UserLogTest.h"

#include "parser/StringParser.h"

#include <gmock/gmock.h>

#include <algorithm>
#include <chrono>
#include <cstring>
#include <string>
#include <vector>

#include <fcntl.h>
#include <unistd.h>

using namespace zrm;

// User logs: learning the format, lines to rows, the monitor.

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

class UserLog : public UserLogTest {};

TEST_F(UserLog, BuildsARowFromALine) {
    makeLog(R"(A , "%d-%d-%d %d:%d:%d %s %[^[][%[^]]] %[^:]: %[^\n]" , )"
            "year month day hour minute second system source type class description");
    long result = -1;
    const zrm_rmlogent_data_t row =
        format("2006-10-05 07:03:09 web1 sshd[412] error: Failed password\n", result);
    EXPECT_EQ(result, 0);
    EXPECT_EQ(columnText(row.entrytime), "1061005070309000");
    EXPECT_EQ(columnText(row.entrysys), "web1");
    EXPECT_EQ(columnText(row.entrysrc), "sshd");
    EXPECT_EQ(columnText(row.entrytype), "412");
    EXPECT_EQ(columnText(row.entryclass), "error");
    EXPECT_EQ(columnText(row.entrydesc), "Failed password");
}

TEST_F(UserLog, FillsTheCommonColumnsAndTheUTF8Columns) {
    makeLog(R"(a,"%s %[^\n]",source description)");
    long result = -1;
    const zrm_rmlogent_data_t row = format("d\xe9mon caf\xe9 ferm\xe9\n", result);
    EXPECT_EQ(result, 0);
    EXPECT_EQ(columnText(row.originnode), "web1:ZRM");
    EXPECT_EQ(columnText(row.logpath), m_directory.path().string() + "/");
    EXPECT_EQ(columnText(row.logname), "app.log");
    EXPECT_EQ(columnText(row.ulogname), "app.log");
    EXPECT_EQ(columnText(row.timestamp), "1061005123456000");
    EXPECT_EQ(row.freqthresh, 0);
    EXPECT_EQ(columnText(row.entrysrc), "d\xe9mon");
    EXPECT_EQ(columnText(row.uentrysrc), "d\xc3\xa9mon");
    EXPECT_EQ(columnText(row.entrydesc), "caf\xe9 ferm\xe9");
    EXPECT_EQ(columnText(row.uentrydesc), "caf\xc3\xa9 ferm\xc3\xa9");
    const auto translations = LocaleDouble::translations();
    ASSERT_GE(translations.size(), 2U);
    const auto& source = translations[translations.size() - 2];
    EXPECT_EQ(source.source.size(), 32U) << "the whole column, padding included";
    EXPECT_EQ(source.targetSize, 96U);
    EXPECT_EQ(source.flags, 256);
    const auto& description = translations.back();
    EXPECT_EQ(description.source.size(), 256U);
    EXPECT_EQ(description.targetSize, 768U);
    EXPECT_EQ(description.flags, 256);
}

TEST_F(UserLog, CutsFieldsAtTheirColumnsWithoutTerminators) {
    makeLog(R"(A,"%100[a]%100[b]%100[c]%100[d]%1000[e]",system source type class description)");
    long result = -1;
    const zrm_rmlogent_data_t row =
        format(std::string(100, 'a') + std::string(100, 'b') + std::string(100, 'c') +
                   std::string(100, 'd') + std::string(1000, 'e') + "\n",
               result);
    EXPECT_EQ(result, 0);
    EXPECT_EQ(columnText(row.entrysys), std::string(32, 'a'));
    EXPECT_EQ(columnText(row.entrysrc), std::string(32, 'b'));
    EXPECT_EQ(columnText(row.entrytype), std::string(16, 'c'));
    EXPECT_EQ(columnText(row.entryclass), std::string(16, 'd'));
    EXPECT_EQ(columnText(row.entrydesc), std::string(256, 'e'));
}

TEST_F(UserLog, TimeTextsHoldSevenCharacters) {
    makeLog(R"(A,"%20s",year)");
    RecordingTrace trace(TRC1_ERROR);
    EXPECT_EQ(timeOf("abcdefghijk\n"), "1061005123400000");
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error: invalid year found in event entrytime; 'abcdefg'"));
}

TEST_F(UserLog, ALineThatDoesNotMatchLeavesABlankRow) {
    makeLog(R"(A,"%d %s",day description)");
    RecordingTrace trace(TRC1_ERROR);
    long result = 0;
    const zrm_rmlogent_data_t row = format("no number\n", result);
    EXPECT_EQ(result, -1);
    EXPECT_EQ(columnText(row.originnode), "");
    EXPECT_THAT(trace.messages(),
                ElementsAre("Error: scan failed for variable #1; day. Looking for %d; found no "
                            "number\n. Scan terminated."));
    trace.clear();
    trace.setLevel(TRC1_DETAIL);
    format("\n", result);
    EXPECT_EQ(result, -1);
    EXPECT_EQ(trace.count("This is a blank line."), 1);
}

TEST_F(UserLog, ALineWithoutNamedFieldsHasNoRow) {
    makeLog(R"(A,"%*d %*s",)");
    ASSERT_NE((*m_log).*(&UserLogMembers::SPAnchor), nullptr);
    long result = 0;
    format("12 text\n", result);
    EXPECT_EQ(result, -1) << "a result below 1";
}

TEST_F(UserLog, AFormatThatCannotBeLearnedStopsTheMonitor) {
    RecordingTrace trace(TRC1_ERROR);
    m_line = validLog(m_path, " ;N ;U ;A,\"%y\",day");
    m_log = std::make_unique<UserLogFile>(*m_line, nullptr);
    waitForEnd(*m_log);
    m_log->stopThread();
    EXPECT_EQ(m_log->monitorStatus(), MONITOR_ERR_FORMAT);
    EXPECT_THAT(trace.messages(),
                ElementsAre("Invalid convcode or receiving variable size specified for code y.  "
                            "Directive is %y",
                            "Error occurred while interpreting format command for file " + m_path +
                                "; monitoring not started. "));
    EXPECT_EQ((*m_log).*(&UserLogMembers::SPAnchor), nullptr);
    trace.clear();
    long result = 0;
    format("7\n", result);
    EXPECT_EQ(result, -1);
}

TEST_F(UserLog, NoFormatIsTheSameAsAnEmptyFormat) {
    RecordingTrace trace(TRC1_ERROR);
    m_line = validLog(m_path, " ;N ;U");
    m_log = std::make_unique<UserLogFile>(*m_line, nullptr);
    waitForEnd(*m_log);
    m_log->stopThread();
    EXPECT_EQ(m_log->monitorStatus(), MONITOR_ERR_FORMAT);
    EXPECT_THAT(trace.messages(),
                ElementsAre("Scan for start of format specifier failed; looking for \" %*1[Aa] , "
                            "\"%n\" but found:  ",
                            "Error occurred while interpreting format command for file " + m_path +
                                "; monitoring not started. "));
}

TEST_F(UserLog, ReportsMemoryThatRunsOutForTheParser) {
    makeLog(wholeLine);
    ((*m_log).*(&UserLogMembers::SPAnchor)).reset();
    RecordingTrace trace(TRC1_ERROR);
    const Fault fault("new", ENOMEM);
    *m_log = *m_line; // restarts the monitor
    waitForEnd(*m_log);
    m_log->stopThread();
    EXPECT_EQ(m_log->monitorStatus(), MONITOR_ERR_NO_MEMORY);
    EXPECT_THAT(trace.messages(), ElementsAre("Error: memory allocation failed for " +
                                              std::to_string(sizeof(StringParser)) +
                                              " bytes; monitoring not started for file " + m_path +
                                              ". errno = 12; Cannot allocate memory"));
}

TEST_F(UserLog, TheFormatIsLearnedOnce) {
    makeLog(wholeLine);
    const StringParser* const learned = ((*m_log).*(&UserLogMembers::SPAnchor)).get();
    ASSERT_NE(learned, nullptr);
    EXPECT_EQ(m_log->monitorStatus(), MONITOR_ERR_OPEN);
    const Fault fault("open", EACCES);
    *m_log = *m_line; // restarts the monitor
    waitForEnd(*m_log);
    EXPECT_EQ(((*m_log).*(&UserLogMembers::SPAnchor)).get(), learned);
}

TEST_F(UserLog, DumpsItselfInDetailBeforeItsThreadStarts) {
    RecordingTrace trace(TRC1_DETAIL);
    makeLog(wholeLine);
    const std::vector<std::string> messages = trace.messages();
    const auto own = std::find(messages.begin(), messages.end(),
                               "\n\tSPAnchor\t\t= (nil)\n\tNumericMonth\t\t= 1\n");
    ASSERT_GT(own - messages.begin(), 1);
    ASSERT_NE(own, messages.end());
    EXPECT_THAT(own[-2], HasSubstr("\n\tLogFileNameUTF8\t\t= \""));
    EXPECT_THAT(own[-1], HasSubstr("\n\tMonitorStatus\t\t= 0\n"));
    trace.clear();
    trace.setLevel(TRC1_ERROR);
    m_log->printSelf();
    char expected[80];
    std::snprintf(expected, sizeof expected, "\n\tSPAnchor\t\t= %p\n\tNumericMonth\t\t= 1\n",
                  static_cast<void*>(((*m_log).*(&UserLogMembers::SPAnchor)).get()));
    EXPECT_EQ(trace.messages().back(), expected);
}

TEST_F(UserLog, RowsOfAMonitorEqualThoseBuiltOneByOne) {
    makeLog(R"(A,"%d %40s %300[^\n]",day source description)");
    std::vector<std::string> lines;
    std::string content;
    for (std::size_t i = 0; i < 200; ++i) {
        const bool isBad = i % 7 == 6;
        lines.push_back((isBad ? "word " : "7 ") + std::string(1 + i * 11 % 38, 's') + " " +
                        std::string(1 + i * 29 % 290, 'd') + "\n");
        content += lines.back();
    }
    write(content);
    const int fd = open(m_path.c_str(), O_RDONLY);
    (*m_log).*(&UserLogMembers::LogFD) = fd;
    EventRecorder::writeThresholds();
    EXPECT_EQ(m_log->readLog(), 0);
    close(fd);
    (*m_log).*(&UserLogMembers::LogFD) = -1;

    const std::vector<zrm_rmlogent_data_t> rows = EventRecorder::rows();
    std::size_t row = 0;
    for (std::string& line : lines) {
        zrm_rmlogent_data_t alone;
        std::memset(&alone, '#', sizeof alone);
        if (m_log->formatEntryAsRow(line.data(), &alone, nullptr) == 0) {
            ASSERT_LT(row, rows.size());
            ASSERT_EQ(std::memcmp(&rows[row], &alone, sizeof alone), 0) << line;
            ++row;
        }
    }
    EXPECT_EQ(row, 172U);
    EXPECT_EQ(rows.size(), row);
}

TEST_F(UserLog, TheMonitorReportsAppendedLines) {
    RecordingTrace trace(TRC1_ERROR);
    write("5 before the start\n");
    m_line = validLog(m_path, R"( ;N ;U ;A,"%d %[^\n]",day description)");
    const Fault waits("select", EINTR, {.times = 0});
    const auto start = std::chrono::steady_clock::now();
    m_log = std::make_unique<UserLogFile>(*m_line, nullptr);
    // The current end is found before the first check. Wait until reports are possible, then
    // append.
    _RequestThresholds thresholds = window("0", "9");
    void* state = nullptr;
    while (state == nullptr) {
        state = m_log->startReportRequest(&thresholds);
    }
    m_log->endReportRequest(&state);
    std::vector<zrm_rmlogent_data_t> rows;
    for (int line = 0; rows.empty() && line < 10; ++line) {
        m_directory.append("app.log", "7 appended\nnot a day\n\n");
        rows = EventRecorder::waitForRows(1, 2);
    }
    ASSERT_FALSE(rows.empty());
    EXPECT_EQ(columnText(rows[0].entrydesc), "appended");
    EXPECT_EQ(columnText(rows[0].entrytime), "1061007123400000");
    m_log->stopThread();
    const auto waited = std::chrono::steady_clock::now() - start;
    EXPECT_GE(waits.calls(), 1);
    EXPECT_GE(waited, std::chrono::seconds(waits.calls()) - std::chrono::milliseconds(100))
        << "a wait of one second follows each check";
    EXPECT_EQ(m_log->monitorStatus(), MONITOR_STOPPED);
    EXPECT_EQ(((*m_log).*(&UserLogMembers::LogFileP)).load(), nullptr) << "the log is closed";
    EXPECT_EQ(m_log->numEvents(), 3 * static_cast<std::int64_t>(EventRecorder::rows().size()));
    EXPECT_EQ(m_log->numFormatErrors(), m_log->numEvents() / 3 * 2) << "words and blank lines";
}

} // namespace
