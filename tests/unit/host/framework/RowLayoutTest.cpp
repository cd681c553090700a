#include "host/framework/RowLayout.h"

#include "unit/host/framework/TestTable.h"

#include <gtest/gtest.h>

using namespace zrm::host;

namespace {

class RowLayoutTest : public testing::Test {
protected:
    TestManager manager;
    TestReceiver receiver;
    ContextInfo context{receiver};
    RequestDetail detail;
    TestRequest request{&detail, &context, &manager};
};

TEST_F(RowLayoutTest, NamesTheColumnsInTableOrder) {
    const RowLayout layout(request);
    ASSERT_EQ(layout.columns().size(), 4u);
    EXPECT_EQ(layout.columns()[0].name, "LOGPATH");
    EXPECT_EQ(layout.columns()[1].name, "LOGNAME");
    EXPECT_EQ(layout.columns()[1].offset, 16u);
    EXPECT_EQ(layout.columns()[1].width, 12u);
    EXPECT_EQ(layout.columns()[2].type, COLUMN_UTF8);
    EXPECT_FALSE(layout.columns()[2].isInteger());
    EXPECT_TRUE(layout.columns()[3].isInteger());
}

TEST_F(RowLayoutTest, FindsAColumnByItsExactName) {
    const RowLayout layout(request);
    EXPECT_EQ(layout.find("NUMBER"), &layout.columns()[3]);
    EXPECT_EQ(layout.find("number"), nullptr);
    EXPECT_EQ(layout.find(""), nullptr);
}

TEST_F(RowLayoutTest, ReadsARow) {
    const RowLayout layout(request);
    TestRow row("/var/log/", "twelve_bytes", "", -7);
    EXPECT_EQ(layout.find("LOGPATH")->text(row.bytes()), "/var/log/");
    EXPECT_EQ(layout.find("LOGNAME")->text(row.bytes()), "twelve_bytes");
    EXPECT_EQ(layout.find("TEXT")->text(row.bytes()), "");
    EXPECT_EQ(layout.find("NUMBER")->integer(row.bytes()), -7);
}

// A column that the table cannot describe is left out; the table's count may be too high.
TEST_F(RowLayoutTest, LeavesOutUndescribedColumns) {
    class Partly : public TestRequest {
    public:
        using TestRequest::TestRequest;
        unsigned GetColumnInfo(ColumnInfo* info, int index) override {
            return index == 1 ? 0x21060007 : TestRequest::GetColumnInfo(info, index);
        }
    };
    Partly partly(&detail, &context, &manager);
    const RowLayout layout(partly);
    ASSERT_EQ(layout.columns().size(), 3u);
    EXPECT_EQ(layout.columns()[1].name, "TEXT");
}

} // namespace
