// The Monitored Logs table: its description, its registration and its samples.

#include "MonitoredLogsFixture.h"
#include "host/framework/Tables.h"
#include "support/Faults.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <cstring>
#include <memory>
#include <tuple>

#include <fcntl.h>
#include <sys/stat.h>

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

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

} // namespace
