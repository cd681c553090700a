#include "host/config/Columns.h"

#include "agent/zrmmain.h"
#include "framework/ctreq.h"
#include "host/framework/Request.h"
#include "host/framework/RowLayout.h"
#include "logmgr/LogManager.h"
#include "support/RecordingTrace.h"
#include "tables/zrm_rmlogent_manager.h"
#include "tables/zrm_rmmonlog_base.h"
#include "unit/host/framework/TestTable.h"

#include <gtest/gtest.h>

using namespace zrm;
using namespace zrm::host;

namespace {

/// A request that only describes its table.
class Description : public zrm_rmmonlog_base {
public:
    using zrm_rmmonlog_base::zrm_rmmonlog_base;
    void TakeSample() override {}
};

void expectSame(std::span<const Column> columns, const RowLayout& layout) {
    ASSERT_EQ(columns.size(), layout.columns().size());
    for (std::size_t index = 0; index < columns.size(); ++index) {
        const RowColumn& known = layout.columns()[index];
        EXPECT_EQ(columns[index].name, known.name);
        EXPECT_EQ(static_cast<std::size_t>(columns[index].width), known.width) << known.name;
        EXPECT_EQ(columns[index].isNumber, known.isInteger()) << known.name;
        EXPECT_EQ(columns[index].isUtf8, known.type == COLUMN_UTF8) << known.name;
    }
}

class ColumnsTest : public testing::Test {
protected:
    ColumnsTest() {
        detail.name = "layout";
        detail.sampleType = SAMPLE_REPORT;
    }

    RecordingTrace trace{0};
    RequestDetail detail;
    TestReceiver receiver;
};

TEST_F(ColumnsTest, AreThoseOfLogEntries) {
    zrm_rmlogent_manager entries("ZRM", "RMLOGENT");
    const Request request(entries, detail, receiver);
    expectSame(columnsOf("RMLOGENT"), RowLayout(*request.get()));
}

TEST_F(ColumnsTest, AreThoseOfMonitoredLogs) {
    TestManager manager;
    ContextInfo context(receiver);
    Description request(&detail, &context, &manager);
    expectSame(columnsOf("RMMONLOG"), RowLayout(request));
}

TEST_F(ColumnsTest, AreNoneForOtherTables) {
    EXPECT_TRUE(columnsOf("").empty());
    EXPECT_TRUE(columnsOf("rmlogent").empty());
}

TEST_F(ColumnsTest, AreFoundByTheirName) {
    const std::span<const Column> columns = columnsOf("RMLOGENT");
    ASSERT_NE(findColumn(columns, "ENTRYTIME"), nullptr);
    EXPECT_TRUE(findColumn(columns, "ENTRYTIME")->isTime);
    EXPECT_FALSE(findColumn(columns, "ENTRYDESC")->isTime);
    EXPECT_EQ(findColumn(columns, "entrytime"), nullptr);
    EXPECT_EQ(findColumn(columns, "LOGTYPE"), nullptr);
}

} // namespace
