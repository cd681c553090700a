// The Monitored Logs table: its description, its registration and its samples.

#include "tables/zrm_rmmonlog_agent.h"
#include "tables/zrm_rmmonlog_manager.h"

#include "base/ProcessValues.h"

#include "TestLogs.h"
#include "TestRequest.h"
#include "host/framework/Tables.h"
#include "support/Faults.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"
#include "support/TimeZone.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>
#include <memory>
#include <tuple>

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

constexpr long now = 1'800'000'000;

using Column =
    std::tuple<std::string, std::string, int, int, int>; // name, internal, type, at, width

const Column monitoredLogsColumns[] = {
    {"ORIGINNODE", "originnode", 9, 0, 64},  {"LOGPATH", "logpath", 9, 64, 256},
    {"LOGNAME", "logname", 9, 320, 128},     {"LOGTYPE", "logtype", 9, 448, 1},
    {"MONSTATUS", "monstatus", 9, 449, 32},  {"MONTIME", "montime", 9, 481, 16},
    {"NUMEVENTS", "numevents", 3, 500, 4},   {"NUMERRORS", "numerrors", 3, 504, 4},
    {"LOGSIZE", "logsize", 3, 508, 4},       {"LOGMODDATE", "logmoddate", 9, 512, 16},
    {"DEBUGMODE", "debugmode", 9, 528, 1},   {"FORMATTER", "formatter", 9, 529, 256},
    {"TIMESTAMP", "timestamp", 9, 785, 16},  {"SAMPLENO", "sampleno", 3, 804, 4},
    {"ROWNO", "rowno", 3, 808, 4},           {"ULOGPATH", "ulogpath", 12, 812, 768},
    {"ULOGNAME", "ulogname", 12, 1580, 384},
};

std::string padded(const std::string& text, std::size_t width) {
    return text + std::string(width - text.size(), ' ');
}

template <std::size_t width> std::string text(const char (&column)[width]) {
    return std::string(column, width);
}

class MonitoredLogs : public testing::Test {
protected:
    MonitoredLogs() {
        std::memcpy(m_systemName, "web1:ZRM", sizeof "web1:ZRM");
        gSystemName = m_systemName;
    }
    ~MonitoredLogs() override { gSystemName = nullptr; }

    void open() { m_request.reset(m_manager.CreateCtreq(&m_test, nullptr)); }
    /// Takes one sample and returns its messages.
    std::vector<std::string> sample(unsigned traceClass) {
        if (!m_request) {
            open();
        }
        RecordingTrace trace(traceClass);
        m_request->TakeSample();
        return trace.messages();
    }
    zrm_rmmonlog_data_t row(unsigned index) const {
        zrm_rmmonlog_data_t copy{};
        EXPECT_LT(index, m_request->count);
        std::memcpy(&copy, m_request->rows() + std::size_t{index} * sizeof copy, sizeof copy);
        return copy;
    }

    TimeZone m_zone{"UTC0"};
    FakeClock m_clock{now};
    TemporaryDirectory m_directory;
    char m_systemName[65];
    TestLogs m_logs;
    zrm_rmmonlog_manager m_manager{"ZRM", "RMMONLOG"};
    TestRequest m_test{SAMPLE_REPORT, "report"};
    std::unique_ptr<ctreq> m_request;
};

// The description of the table.

TEST_F(MonitoredLogs, EveryColumnIsDescribed) {
    open();
    EXPECT_EQ(m_request->rowSize, 1964U);
    EXPECT_EQ(m_request->allocSize, 5U);
    ASSERT_EQ(m_request->NumColumns(), 17);
    for (int i = 0; i < 17; ++i) {
        ColumnInfo info{};
        EXPECT_EQ(m_request->GetColumnInfo(&info, i), 0U);
        const auto& [name, internal, type, offset, width] = monitoredLogsColumns[i];
        EXPECT_EQ(info.name, internal);
        EXPECT_EQ(info.type, type) << internal;
        EXPECT_EQ(info.offset, offset) << internal;
        EXPECT_EQ(info.length, width) << internal;
    }
}

TEST_F(MonitoredLogs, TheIndexAfterTheLastColumnIsNotAnErrorAndFillsNothing) {
    open();
    const char* const name = "untouched";
    for (const auto& [index, status] : {std::pair(17, 0U), {18, 0x21060007U}, {-1, 0x21060007U}}) {
        ColumnInfo info{name, 11, 12, 13};
        EXPECT_EQ(m_request->GetColumnInfo(&info, index), status) << index;
        EXPECT_EQ(info.name, name);
        EXPECT_EQ(info.offset, 11);
        EXPECT_EQ(info.length, 12);
        EXPECT_EQ(info.type, 13);
    }
}

TEST_F(MonitoredLogs, EveryColumnIsComparedByItsUpperCaseName) {
    open();
    std::string bytes(1964, '\0');
    int number = 0;
    for (const auto& [name, internal, type, offset, width] : monitoredLogsColumns) {
        const auto at = static_cast<std::size_t>(offset);
        if (type == COLUMN_INTEGER) {
            const std::int32_t value = ++number * -1000;
            std::memcpy(bytes.data() + at, &value, sizeof value);
        } else {
            std::memset(bytes.data() + at, 'a' + ++number, static_cast<std::size_t>(width));
        }
    }
    number = 0;
    char value[] = "value";
    for (const auto& [name, internal, type, offset, width] : monitoredLogsColumns) {
        ++number;
        m_test.calls.clear();
        m_test.comparison = number;
        std::string column = name;
        EXPECT_EQ(m_request->ColumnIsException(bytes.data(), column.data(), INTF_LESS, value),
                  static_cast<unsigned>(number));
        const std::string compared = type == COLUMN_INTEGER
                                         ? std::to_string(number * -1000)
                                         : "'" +
                                               std::string(static_cast<std::size_t>(width),
                                                           static_cast<char>('a' + number)) +
                                               "'";
        EXPECT_THAT(m_test.calls, ElementsAre("compare 5 " + compared + " with value"));
    }
    m_test.calls.clear();
    std::string other = "ENTRYTIME";
    EXPECT_EQ(m_request->ColumnIsException(bytes.data(), other.data(), INTF_LESS, value), 0U);
    EXPECT_THAT(m_test.calls, IsEmpty());
}

TEST_F(MonitoredLogs, StateDumpShowsEveryColumn) {
    const std::string path = m_directory.write("a.log", "12345");
    timespec times[2] = {{now - 10, 0}, {now - 10, 0}};
    utimensat(AT_FDCWD, path.c_str(), times, 0);
    TestLog& log = m_logs.add(path);
    log.setStatus(MONITOR_RUNNING, now - 100);
    log.setLogProcedure("%s ENTRYDESC");
    m_test.interval = 3;
    sample(0);
    const std::string directory = m_directory.path().string() + "/";
    char head[100];
    std::snprintf(head, sizeof head, "zrm_rmmonlog_base @%p <%u,%u>\n",
                  static_cast<void*>(m_request.get()), m_request->identifier(),
                  m_request->handle());
    RecordingTrace trace(TRC1_DETAIL);
    m_request->PrintSelf();
    EXPECT_THAT(trace.messages(),
                ElementsAre(head, "\t::appl=ZRM,table=RMMONLOG,interval=3000,samptype=3\n",
                            "(thresholds)", "\t_data {\n",
                            "\t\tcount=1, allocated=5, allocSize=5\n", "\t\t{\n",
                            "\t\toriginnode=\"" + padded("web1:ZRM", 64) + "\"\n",
                            "\t\tlogpath=\"" + padded(directory, 256) + "\"\n",
                            "\t\tlogname=\"" + padded("a.log", 128) + "\"\n", "\t\tlogtype=\"S\"\n",
                            "\t\tmonstatus=\"" + padded("Running", 32) + "\"\n",
                            "\t\tmontime=\"1270115075820000\"\n", "\t\tnumevents=0\n",
                            "\t\tnumerrors=0\n", "\t\tlogsize=5\n",
                            "\t\tlogmoddate=\"1270115075950000\"\n", "\t\tdebugmode=\"N\"\n",
                            "\t\tformatter=\"" + padded("%s ENTRYDESC", 256) + "\"\n",
                            "\t\ttimestamp=\"1270115080000000\"\n", "\t\tsampleno=0\n",
                            "\t\trowno=0\n", "\t\tulogpath=\"" + padded(directory, 768) + "\"\n",
                            "\t\tulogname=\"" + padded("a.log", 384) + "\"\n", "\t\t}\n"));
}

// Registration and events.

bool registersOnce() {
    zrm_rmmonlog_data_t row{};
    if (zrm_rmmonlog_manager::EventArrived(&row, 1) != 0 || zrm_rmmonlog_init() != 0) {
        return false;
    }
    TestLogs logs;
    TableManager* const manager = Tables::find("RMMONLOG");
    TestRequest test(SAMPLE_SITUATION);
    const std::unique_ptr<ctreq> request(manager->CreateCtreq(&test, nullptr));
    manager->requests().Add(request.get());
    test.dispatchStatus = 5;
    return manager->application() == std::string("ZRM") &&
           zrm_rmmonlog_manager::EventArrived(&row, 1) == 5 && test.dispatched.size() == 1 &&
           request->count == 0;
}

bool reportsMissingMemory() {
    const Fault fault("new", ENOMEM);
    return zrm_rmmonlog_init() == 0x21060002 && Tables::find("RMMONLOG") == nullptr;
}

class MonitoredLogsRegistrationDeathTest : public testing::Test {
protected:
    MonitoredLogsRegistrationDeathTest() { GTEST_FLAG_SET(death_test_style, "threadsafe"); }
};

TEST_F(MonitoredLogsRegistrationDeathTest, EventsReachTheTableOnceItIsRegistered) {
    EXPECT_EXIT(std::_Exit(registersOnce() ? 7 : 1), testing::ExitedWithCode(7), "");
}

TEST_F(MonitoredLogsRegistrationDeathTest, MissingMemoryLeavesTheTableUnregistered) {
    EXPECT_EXIT(std::_Exit(reportsMissingMemory() ? 7 : 1), testing::ExitedWithCode(7), "");
}

TEST_F(MonitoredLogs, RequestsNotifyTheLogManagerThatTheServerIsUp) {
    open();
    EXPECT_NE(dynamic_cast<zrm_rmmonlog_agent*>(m_request.get()), nullptr);
    EXPECT_THAT(m_logs.calls, ElementsAre("server up"));
    RecordingTrace trace(TRC1_FLOW | TRC1_DETAIL | TRC1_ERROR);
    m_request.reset();
    EXPECT_THAT(trace.events(),
                ElementsAre("zrm_rmmonlog_agent.cpp entry", "zrm_rmmonlog_agent.cpp exit"));
    EXPECT_THAT(trace.messages(), IsEmpty());
    EXPECT_THAT(m_logs.calls, ElementsAre("server up"));
}

TEST_F(MonitoredLogs, CreatesNoRequestWithoutMemory) {
    const Fault fault("new", ENOMEM);
    EXPECT_EQ(m_manager.CreateCtreq(&m_test, nullptr), nullptr);
}

// Samples.

TEST_F(MonitoredLogs, WithoutALogManagerReturnsNothing) {
    m_logs.add("/a/b");
    sample(0);
    m_logs.withdraw();
    EXPECT_THAT(sample(TRC1_ERROR), ElementsAre("Log Manager not found. Request terminating."));
    EXPECT_EQ(m_request->count, 0U);
}

TEST_F(MonitoredLogs, WithoutLogsThereAreNoRows) {
    const Fault fault("new", ENOMEM, {.skip = 1}); // the request itself
    EXPECT_THAT(sample(TRC1_DETAIL | TRC1_ERROR),
                ElementsAre("No logs are currently being monitored."));
    EXPECT_EQ(fault.calls(), 1) << "nothing is allocated";
    EXPECT_THAT(m_logs.calls, ElementsAre("server up", "begin", "end"));
    EXPECT_EQ(m_request->count, 0U);
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty()) << "it is of the detail class";
}

TEST_F(MonitoredLogs, EachLogHasOneRow) {
    for (const char* const name : {"/a/1", "/a/2", "/a/3", "/a/4", "/a/5", "/a/6"}) {
        m_logs.add(name);
    }
    sample(0);
    ASSERT_EQ(m_request->count, 6U);
    for (unsigned i = 0; i < 6; ++i) {
        EXPECT_EQ(text(row(i).logname), padded(std::to_string(i + 1), 128));
    }
    EXPECT_THAT(m_logs.calls, ElementsAre("server up", "begin", "next 0", "next 1", "next 2",
                                          "next 3", "next 4", "next 5", "next 6", "end"));
    sample(0);
    EXPECT_EQ(m_request->count, 6U) << "each sample starts over";
}

TEST_F(MonitoredLogs, RowsAreFiltered) {
    m_logs.add("/a/1");
    m_logs.add("/a/2");
    m_test.accepts = [](const char* row) { return row[320] == '2'; };
    sample(0);
    ASSERT_EQ(m_request->count, 1U);
    EXPECT_EQ(text(row(0).logname), padded("2", 128));
}

TEST_F(MonitoredLogs, MoreLogsThanCountedEndTheSample) {
    m_logs.add("/a/1");
    m_logs.add("/a/2");
    m_logs.add("/a/3");
    m_logs.missing = 1;
    const auto messages = sample(TRC1_ERROR);
    EXPECT_EQ(messages.back(), "Data array size of 2 exceeded. Request terminated.");
    EXPECT_EQ(m_request->count, 2U);
    EXPECT_EQ(m_logs.calls.back(), "end");
}

TEST_F(MonitoredLogs, FewerLogsThanCountedStillHaveTheirRows) {
    m_logs.add("/a/1");
    m_logs.missing = -3;
    sample(0);
    EXPECT_EQ(m_request->count, 1U);
}

TEST_F(MonitoredLogs, WithoutMemoryThereAreNoRows) {
    m_logs.add("/a/1");
    m_logs.add("/a/2");
    open();
    const Fault fault("new", ENOMEM);
    EXPECT_THAT(sample(TRC1_ERROR),
                ElementsAre("Memory allocation for 3928 bytes failed. Request terminating."));
    EXPECT_EQ(m_request->count, 0U);
    EXPECT_EQ(m_logs.calls.back(), "end");
}

// The columns of a row.

TEST_F(MonitoredLogs, RowShowsTheLogsState) {
    const std::string path = m_directory.write("app.log", std::string(1234, 'x'));
    timespec times[2] = {{now - 3600, 0}, {now - 3600, 0}};
    utimensat(AT_FDCWD, path.c_str(), times, 0);
    TestLog& log = m_logs.add(path);
    log.setType('U');
    log.setDebugMode('Y');
    log.setLogProcedure("%4d YEAR");
    log.setStatus(MONITOR_ERR_READ, now - 60);
    log.setCounts(17, 3);
    sample(0);
    const zrm_rmmonlog_data_t shown = row(0);
    EXPECT_EQ(text(shown.originnode), padded("web1:ZRM", 64));
    EXPECT_EQ(text(shown.logpath), padded(m_directory.path().string() + "/", 256));
    EXPECT_EQ(text(shown.ulogpath), padded(m_directory.path().string() + "/", 768));
    EXPECT_EQ(text(shown.logname), padded("app.log", 128));
    EXPECT_EQ(text(shown.ulogname), padded("app.log", 384));
    EXPECT_EQ(shown.logtype[0], 'U');
    EXPECT_EQ(text(shown.monstatus), padded(monitorStatusText(MONITOR_ERR_READ), 32));
    EXPECT_EQ(text(shown.montime), "1270115075900000");
    EXPECT_EQ(shown.numevents, 17);
    EXPECT_EQ(shown.numerrors, 3);
    EXPECT_EQ(shown.logsize, 1234);
    EXPECT_EQ(text(shown.logmoddate), "1270115070000000");
    EXPECT_EQ(shown.debugmode[0], 'Y');
    EXPECT_EQ(text(shown.formatter), padded("%4d YEAR", 256));
    EXPECT_EQ(text(shown.timestamp), "1270115080000000");
    EXPECT_EQ(shown.sampleno, 0);
    EXPECT_EQ(shown.rowno, 0);
}

TEST_F(MonitoredLogs, LocalAndUTF8NamesAreShownSeparately) {
    TestLog& log = m_logs.add("/tmp/x");
    log.setLocalName("/\xFC/gr\xFC\xDF"
                     "e");
    log.setUTF8Name("/\xC3\xBC/gr\xC3\xBC\xC3\x9F"
                    "e");
    sample(0);
    EXPECT_EQ(text(row(0).logpath), padded("/\xFC/", 256));
    EXPECT_EQ(text(row(0).logname), padded("gr\xFC\xDF"
                                           "e",
                                           128));
    EXPECT_EQ(text(row(0).ulogpath), padded("/\xC3\xBC/", 768));
    EXPECT_EQ(text(row(0).ulogname), padded("gr\xC3\xBC\xC3\x9F"
                                            "e",
                                            384));
}

TEST_F(MonitoredLogs, LongTextsAreCutAtTheirColumns) {
    const std::string directory = "/" + std::string(900, 'd') + "/";
    TestLog& log = m_logs.add(directory + std::string(500, 'n'));
    log.setLogProcedure(std::string(300, 'f').c_str());
    std::memset(m_systemName, 's', 64);
    m_systemName[64] = '\0';
    sample(0);
    EXPECT_EQ(text(row(0).originnode), std::string(64, 's'));
    EXPECT_EQ(text(row(0).logpath), directory.substr(0, 256));
    EXPECT_EQ(text(row(0).ulogpath), directory.substr(0, 768));
    EXPECT_EQ(text(row(0).logname), std::string(128, 'n'));
    EXPECT_EQ(text(row(0).ulogname), std::string(384, 'n'));
    EXPECT_EQ(text(row(0).formatter), std::string(256, 'f'));
}

TEST_F(MonitoredLogs, ANameOfTwoHundredBytesFillsItsColumnWithoutATerminator) {
    const std::string name(200, 'n');
    m_logs.add(m_directory.write(name, ""));
    EXPECT_THAT(sample(TRC1_ERROR), IsEmpty());
    EXPECT_EQ(text(row(0).logname), std::string(128, 'n'));
    EXPECT_EQ(row(0).logtype[0], 'S') << "the next column follows directly";
    EXPECT_EQ(text(row(0).ulogname), padded(name, 384));
}

TEST_F(MonitoredLogs, MissingNamesAndFormatsAreBlank) {
    m_logs.add("/a/b").setNoName();
    gSystemName = nullptr;
    sample(0);
    EXPECT_EQ(text(row(0).originnode), padded("", 64));
    EXPECT_EQ(text(row(0).logpath), padded("", 256));
    EXPECT_EQ(text(row(0).logname), padded("", 128));
    EXPECT_EQ(text(row(0).ulogpath), padded("", 768));
    EXPECT_EQ(text(row(0).ulogname), padded("", 384));
    EXPECT_EQ(text(row(0).formatter), padded("", 256));
}

TEST_F(MonitoredLogs, CountsAreCutToThirtyTwoBits) {
    m_logs.add("/a/b").setCounts(0x100000005, 0x2FFFFFFFF);
    sample(0);
    EXPECT_EQ(row(0).numevents, 5);
    EXPECT_EQ(row(0).numerrors, -1);
}

TEST_F(MonitoredLogs, ARemovedFileIsMarked) {
    const std::string path = m_directory.file("gone.log");
    m_logs.add(path);
    EXPECT_THAT(sample(TRC1_ERROR), ElementsAre("stat() command failed for " + path +
                                                ";  errno = 2; No such file or directory."));
    EXPECT_EQ(row(0).logsize, -1);
    EXPECT_EQ(text(row(0).logmoddate), "0000000000000000");
    EXPECT_EQ(text(row(0).timestamp), "1270115080000000") << "the rest of the row is there";
}

TEST_F(MonitoredLogs, AFileThatCannotBeExaminedIsMarked) {
    const std::string path = m_directory.write("a.log", "12345");
    m_logs.add(path);
    const Fault fault("stat", EACCES);
    EXPECT_THAT(sample(TRC1_ERROR), ElementsAre("stat() command failed for " + path +
                                                ";  errno = 13; Permission denied."));
    EXPECT_EQ(row(0).logsize, -1);
}

TEST_F(MonitoredLogs, AHugeFilesSizeIsCutToThirtyTwoBits) {
    const std::string path = m_directory.write("huge.log", "");
    ASSERT_EQ(truncate(path.c_str(), 0x100000007), 0); // sparse
    m_logs.add(path);
    sample(0);
    EXPECT_EQ(row(0).logsize, 7);
}

} // namespace
