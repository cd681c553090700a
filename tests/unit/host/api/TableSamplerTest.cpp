#include "host/api/SampleSource.h"

#include "base/ProcessValues.h"
#include "host/framework/Tables.h"
#include "support/RecordingTrace.h"
#include "unit/host/framework/TestTable.h"

#include <gtest/gtest.h>

#include <string>

using namespace zrm;
using namespace zrm::host;

namespace {

class TableSamplerTest : public testing::Test {
protected:
    TableSamplerTest() {
        TableManager::RegisterWithManager(&entries);
        entries.onCreate = [this](TestRequest& created) {
            created.onSample = [this](TestRequest& request) {
                for (int number = 1; number <= rows; ++number) {
                    TestRow row("/var/log/", "a\"b.log", "text", number);
                    if (request.CheckForException(row.bytes()) != 0) {
                        request.InsertRow(row.bytes());
                    }
                }
            };
        };
    }
    ~TableSamplerTest() override {
        Tables::clear();
        gMaxRows = 1000;
    }

    RecordingTrace trace{0};
    TestManager entries{"RMLOGENT"};
    int rows = 2;
    TableSampler sampler;
};

TEST_F(TableSamplerTest, ReturnsRowsAsJson) {
    const SampleSource::Rows sample = sampler.take("RMLOGENT", {});
    const std::string row =
        R"({"LOGPATH":"/var/log/","LOGNAME":"a\"b.log","TEXT":"text","NUMBER":)";
    EXPECT_EQ(sample.json, "[" + row + "1}," + row + "2}]");
    EXPECT_EQ(sample.count, 2u);
    EXPECT_FALSE(sample.truncated);
}

TEST_F(TableSamplerTest, ReturnsTheRowsThatMeetTheConditions) {
    Condition condition = numberCondition("NUMBER", INTF_EQUAL, 2);
    EXPECT_EQ(sampler.take("RMLOGENT", {condition}).count, 1u);
    condition.number = 3;
    const SampleSource::Rows none = sampler.take("RMLOGENT", {condition});
    EXPECT_EQ(none.json, "[]");
    EXPECT_EQ(none.count, 0u);
}

TEST_F(TableSamplerTest, IsTruncatedWhenTheAgentReadAsManyRowsAsItMay) {
    const Condition condition = numberCondition("NUMBER", INTF_EQUAL, 2);
    gMaxRows = 3;
    EXPECT_FALSE(sampler.take("RMLOGENT", {condition}).truncated);
    rows = 3;
    const SampleSource::Rows sample = sampler.take("RMLOGENT", {condition});
    EXPECT_TRUE(sample.truncated) << "however many rows the conditions leave";
    EXPECT_EQ(sample.count, 1u);
}

TEST_F(TableSamplerTest, ALogIsMonitoredWhenItsNameIsInTheTable) {
    TestManager logs{"RMMONLOG"};
    TableManager::RegisterWithManager(&logs);
    logs.onCreate = entries.onCreate;
    Condition name = textCondition("LOGNAME", INTF_EQUAL, "a\"b.log");
    // The conditions of a report that do not name its log are not for this table.
    const Condition other = numberCondition("NUMBER", INTF_EQUAL, 5);
    EXPECT_TRUE(sampler.isMonitored({name, other}));
    name.text = "b.log";
    EXPECT_FALSE(sampler.isMonitored({name, other}));
    rows = 0;
    EXPECT_FALSE(sampler.isMonitored({}));
}

TEST_F(TableSamplerTest, ALogIsNotMonitoredWhereNoTableIsRegistered) {
    EXPECT_FALSE(sampler.isMonitored({}));
}

TEST_F(TableSamplerTest, ATableThatIsNotRegisteredHasNoRows) {
    const SampleSource::Rows sample = sampler.take("RMMONLOG", {});
    EXPECT_EQ(sample.json, "[]");
    EXPECT_EQ(sample.count, 0u);
}

} // namespace
