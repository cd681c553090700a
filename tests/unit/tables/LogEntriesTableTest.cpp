// The Log Entries table as the framework sees it: its columns, their comparison, the default row
// filter and the state dump.

#include "tables/zrm_rmlogent_base.h"
#include "tables/zrm_rmlogent_manager.h"

#include "TestRequest.h"
#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstring>
#include <tuple>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class RowHolder : public zrm_rmlogent_base {
public:
    using zrm_rmlogent_base::zrm_rmlogent_base;
    void TakeSample() override {}
};

using Column =
    std::tuple<std::string, std::string, int, int, int>; // name, internal, type, at, width

const Column logEntriesColumns[] = {
    {"ORIGINNODE", "originnode", 9, 0, 64},   {"LOGPATH", "logpath", 9, 64, 256},
    {"LOGNAME", "logname", 9, 320, 128},      {"ENTRYTIME", "entrytime", 9, 448, 16},
    {"ENTRYSYS", "entrysys", 9, 464, 32},     {"ENTRYSRC", "entrysrc", 9, 496, 32},
    {"ENTRYTYPE", "entrytype", 9, 528, 16},   {"ENTRYCLASS", "entryclass", 9, 544, 16},
    {"ENTRYDESC", "entrydesc", 9, 560, 256},  {"FREQTHRESH", "freqthresh", 3, 816, 4},
    {"PERIODTHRS", "periodthrs", 3, 820, 4},  {"TIMESTAMP", "timestamp", 9, 824, 16},
    {"SAMPLENO", "sampleno", 3, 840, 4},      {"ROWNO", "rowno", 3, 844, 4},
    {"ULOGPATH", "ulogpath", 12, 848, 768},   {"ULOGNAME", "ulogname", 12, 1616, 384},
    {"UENTRYSRC", "uentrysrc", 12, 2000, 96}, {"UENTRYDESC", "uentrydesc", 12, 2096, 768},
};

class LogEntriesTable : public testing::Test {
protected:
    zrm_rmlogent_manager m_manager{"ZRM", "RMLOGENT"};
    TestRequest m_test{SAMPLE_SITUATION};
    RowHolder m_holder{&m_test, nullptr, &m_manager};
};

zrm_rmlogent_data_t blankRow() {
    zrm_rmlogent_data_t row;
    std::memset(&row, ' ', sizeof row);
    row.freqthresh = row.periodthrs = row.sampleno = row.rowno = 0;
    return row;
}

char* bytes(zrm_rmlogent_data_t& row) {
    return reinterpret_cast<char*>(&row);
}

TEST_F(LogEntriesTable, RowSizeAndRoomAreSet) {
    EXPECT_EQ(m_holder.rowSize, 2864U);
    EXPECT_EQ(m_holder.allocSize, 20U);
}

TEST_F(LogEntriesTable, EveryColumnIsDescribed) {
    ASSERT_EQ(m_holder.NumColumns(), 18);
    for (int i = 0; i < 18; ++i) {
        ColumnInfo info{};
        EXPECT_EQ(m_holder.GetColumnInfo(&info, i), 0U);
        const auto& [name, internal, type, offset, width] = logEntriesColumns[i];
        EXPECT_EQ(info.name, internal);
        EXPECT_EQ(info.type, type) << internal;
        EXPECT_EQ(info.offset, offset) << internal;
        EXPECT_EQ(info.length, width) << internal;
    }
}

TEST_F(LogEntriesTable, TheIndexAfterTheLastColumnIsNotAnErrorAndFillsNothing) {
    const char* const name = "untouched";
    for (const auto& [index, status] : {std::pair(18, 0U), {19, 0x21060007U}, {-1, 0x21060007U}}) {
        ColumnInfo info{name, 11, 12, 13};
        EXPECT_EQ(m_holder.GetColumnInfo(&info, index), status) << index;
        EXPECT_EQ(info.name, name);
        EXPECT_EQ(info.offset, 11);
        EXPECT_EQ(info.length, 12);
        EXPECT_EQ(info.type, 13);
    }
}

TEST_F(LogEntriesTable, EveryColumnIsComparedByItsUpperCaseName) {
    zrm_rmlogent_data_t row = blankRow();
    int number = 0;
    for (const auto& [name, internal, type, offset, width] : logEntriesColumns) {
        // Each column is filled to its last byte, so that a wrong offset or width is detected.
        if (type == COLUMN_INTEGER) {
            const std::int32_t value = ++number * -1000;
            std::memcpy(bytes(row) + offset, &value, sizeof value);
        } else {
            std::memset(bytes(row) + offset, 'a' + ++number, static_cast<std::size_t>(width));
        }
    }
    number = 0;
    char value[] = "value";
    for (const auto& [name, internal, type, offset, width] : logEntriesColumns) {
        ++number;
        m_test.calls.clear();
        m_test.comparison = number;
        std::string column = name;
        EXPECT_EQ(m_holder.ColumnIsException(bytes(row), column.data(),
                                             static_cast<_IntfOper>(number), value),
                  static_cast<unsigned>(number));
        const std::string compared = type == COLUMN_INTEGER
                                         ? std::to_string(number * -1000)
                                         : "'" +
                                               std::string(static_cast<std::size_t>(width),
                                                           static_cast<char>('a' + number)) +
                                               "'";
        EXPECT_THAT(m_test.calls, ElementsAre("compare " + std::to_string(number) + " " + compared +
                                              " with value"));
    }
}

TEST_F(LogEntriesTable, UnknownColumnsNeverMatch) {
    zrm_rmlogent_data_t row = blankRow();
    m_test.comparison = 1;
    char value[] = "";
    for (std::string name : {"logname", "LOGNAMES", "LOGNAM", "", "Logname"}) {
        EXPECT_EQ(m_holder.ColumnIsException(bytes(row), name.data(), INTF_EQUAL, value), 0U);
    }
    EXPECT_THAT(m_test.calls, IsEmpty());
}

TEST_F(LogEntriesTable, RowsThatMeetTheConditionsAreInserted) {
    zrm_rmlogent_data_t rows[4] = {blankRow(), blankRow(), blankRow(), blankRow()};
    for (int i = 0; i < 4; ++i) {
        rows[i].rowno = i;
    }
    m_test.accepts = [](const char* row) {
        std::int32_t number;
        std::memcpy(&number, row + 844, sizeof number);
        return number % 2 == 1;
    };
    RecordingTrace trace(TRC1_FINE);
    EXPECT_EQ(m_holder.AddData(rows, 4), 0U);
    EXPECT_THAT(trace.messages(),
                ElementsAre("Passing row 1 to InsertRow().", "Passing row 3 to InsertRow()."));
    ASSERT_EQ(m_holder.count, 2U);
    EXPECT_EQ(std::memcmp(m_holder.rows(), &rows[1], sizeof rows[1]), 0);
    EXPECT_EQ(std::memcmp(m_holder.rows() + 2864, &rows[3], sizeof rows[3]), 0);
}

TEST_F(LogEntriesTable, AFailedInsertionEndsThePass) {
    zrm_rmlogent_data_t rows[4] = {blankRow(), blankRow(), blankRow(), blankRow()};
    m_test.insertStatus = {0, 42};
    RecordingTrace trace(TRC1_FINE);
    EXPECT_EQ(m_holder.AddData(rows, 4), 42U);
    EXPECT_THAT(trace.messages(),
                ElementsAre("Passing row 0 to InsertRow().", "Passing row 1 to InsertRow()."));
    EXPECT_EQ(m_holder.count, 1U);
    EXPECT_EQ(m_holder.AddData(rows, 0), 0U);
    m_test.accepts = [](const char*) { return false; };
    EXPECT_EQ(m_holder.AddData(rows, 4), 0U);
    EXPECT_EQ(m_holder.count, 1U);
}

TEST_F(LogEntriesTable, StateDumpShowsTheRequestAndEveryColumnOfItsRows) {
    m_test.interval = 7;
    RowHolder holder(&m_test, nullptr, &m_manager);
    zrm_rmlogent_data_t row = blankRow();
    std::memset(&row.logname, 'n', sizeof row.logname); // no terminator, no padding
    std::memcpy(row.originnode, "web1:ZRM", sizeof "web1:ZRM");
    row.freqthresh = -5;
    row.periodthrs = 60;
    row.sampleno = 1;
    row.rowno = 2;
    holder.AddData(&row, 1);

    const auto blanks = [](int width) { return std::string(static_cast<std::size_t>(width), ' '); };
    char head[100];
    std::snprintf(head, sizeof head, "zrm_rmlogent_base @%p <%u,%u>\n", static_cast<void*>(&holder),
                  holder.identifier(), holder.handle());
    std::vector<std::string> expected = {
        head,
        "\t::appl=ZRM,table=RMLOGENT,interval=7000,samptype=4\n",
        "(thresholds)",
        "\t_data {\n",
        "\t\tcount=1, allocated=20, allocSize=20\n",
        "\t\t{\n",
        "\t\toriginnode=\"web1:ZRM\"\n",
        "\t\tlogpath=\"" + blanks(256) + "\"\n",
        "\t\tlogname=\"" + std::string(128, 'n') + "\"\n",
        "\t\tentrytime=\"" + blanks(16) + "\"\n",
        "\t\tentrysys=\"" + blanks(32) + "\"\n",
        "\t\tentrysrc=\"" + blanks(32) + "\"\n",
        "\t\tentrytype=\"" + blanks(16) + "\"\n",
        "\t\tentryclass=\"" + blanks(16) + "\"\n",
        "\t\tentrydesc=\"" + blanks(256) + "\"\n",
        "\t\tfreqthresh=-5\n",
        "\t\tperiodthrs=60\n",
        "\t\ttimestamp=\"" + blanks(16) + "\"\n",
        "\t\tsampleno=1\n",
        "\t\trowno=2\n",
        "\t\tulogpath=\"" + blanks(768) + "\"\n",
        "\t\tulogname=\"" + blanks(384) + "\"\n",
        "\t\tuentrysrc=\"" + blanks(96) + "\"\n",
        "\t\tuentrydesc=\"" + blanks(768) + "\"\n",
        "\t\t}\n",
    };
    RecordingTrace trace(TRC1_DETAIL);
    holder.PrintSelf();
    EXPECT_EQ(trace.messages(), expected);
    trace.clear();
    trace.setLevel(~TRC1_DETAIL);
    holder.PrintSelf();
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(LogEntriesTable, StateDumpWithoutRowsEndsWithTheCounters) {
    RecordingTrace trace(TRC1_DETAIL);
    m_holder.PrintSelf();
    ASSERT_EQ(trace.messages().size(), 5U);
    EXPECT_EQ(trace.messages()[4], "\t\tcount=0, allocated=0, allocSize=20\n");
}

TEST_F(LogEntriesTable, OperationsTraceEntryAndExitInTheFlowClass) {
    zrm_rmlogent_data_t row = blankRow();
    RecordingTrace trace(TRC1_FLOW);
    m_holder.AddData(&row, 1);
    EXPECT_THAT(trace.events(),
                ElementsAre("zrm_rmlogent_base.cpp entry", "TableRequest.cpp entry",
                            "TableRequest.cpp exit 0", "zrm_rmlogent_base.cpp exit 0"));
}

#ifdef __GXX_ABI_VERSION
// The framework calls a row holder's operations by slot; AddData stands right behind its own.
template <typename Operation> std::ptrdiff_t slotOf(Operation operation) {
    std::ptrdiff_t slot;
    std::memcpy(&slot, &operation, sizeof slot);
    return slot;
}
TEST_F(LogEntriesTable, AddDataHasTheSlotAfterTheFrameworksOperations) {
    EXPECT_EQ(slotOf(&zrm_rmlogent_base::AddData) - slotOf(&ctreq::CommandCompleted),
              static_cast<std::ptrdiff_t>(sizeof(void*)));
}
#endif

} // namespace
