#include "host/events/RowJson.h"

#include "unit/host/framework/TestTable.h"

#include <gtest/gtest.h>

#include <limits>
#include <string>

using namespace zrm::host;

namespace {

std::string jsonOf(const RowLayout& layout, const char* row) {
    return JsonWriter::text([&](JsonWriter& json) { RowJson(layout).write(json, row); });
}

TEST(RowJson, WritesTheColumnsInTableOrder) {
    TestManager manager;
    TestReceiver receiver;
    ContextInfo context{receiver};
    RequestDetail detail;
    TestRequest request(&detail, &context, &manager);
    const RowLayout layout(request);
    EXPECT_EQ(jsonOf(layout, TestRow("/var/log/", "messages", "say \"hi\"", -42).bytes()),
              R"({"LOGPATH":"/var/log/","LOGNAME":"messages","TEXT":"say \"hi\"","NUMBER":-42})");
    EXPECT_EQ(
        jsonOf(layout, TestRow("", "twelve_bytes", "é\t", std::numeric_limits<int>::min()).bytes()),
        R"({"LOGPATH":"","LOGNAME":"twelve_bytes","TEXT":"é\t","NUMBER":-2147483648})");
}

TEST(RowJson, ARowWithoutColumnsIsAnEmptyObject) {
    class Empty : public TestRequest {
    public:
        using TestRequest::TestRequest;
        int NumColumns() override { return 0; }
    };
    TestManager manager;
    TestReceiver receiver;
    ContextInfo context{receiver};
    RequestDetail detail;
    Empty request(&detail, &context, &manager);
    EXPECT_EQ(jsonOf(RowLayout(request), ""), "{}");
}

} // namespace
