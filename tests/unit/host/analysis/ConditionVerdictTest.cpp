#include "host/analysis/ConditionVerdict.h"

#include "host/analysis/Replay.h"
#include "host/config/ConditionParser.h"
#include "support/RecordingTrace.h"
#include "tables/zrm_rmlogent_manager.h"
#include "unit/host/analysis/TestLog.h"

#include <gtest/gtest.h>

#include <string>
#include <variant>

using namespace zrm;
using namespace zrm::host;

namespace {

Condition parsed(const std::string& text) {
    auto result = ConditionParser("RMLOGENT").parse(text);
    EXPECT_TRUE(result) << text;
    return result.value();
}

class ConditionVerdictTest : public testing::Test {
protected:
    ConditionVerdict verdict(const std::string& condition, const std::string& description) {
        zrm_rmlogent_data_t row = rowAt(0, description);
        const ConditionJudge judge({parsed(condition)}, layout.layout());
        return judge.judge(reinterpret_cast<char*>(&row)).at(0);
    }

    RecordingTrace trace{TRC1_ERROR};
    zrm_rmlogent_manager entries{"ZRM", "RMLOGENT"};
    Replay layout{{}, entries};
};

TEST_F(ConditionVerdictTest, WritesConditionsAsTheyAreRead) {
    for (const char* const text :
         {"ENTRYSRC = 'sshd'", "ENTRYSRC != ''", "ENTRYSRC >= 'a'", "ENTRYSRC <= 'a'",
          "ENTRYSRC < 'a'", "ENTRYSRC > 'a'", "ENTRYDESC contains 'it''s'", "ENTRYDESC starts ' x'",
          "ENTRYDESC matches '^a\\d+$'", "ENTRYSRC in ['a', 'b''c', '']", "SAMPLENO = -5",
          "SAMPLENO in [1, 2]", "field.status >= 500", "field.time > 1.5", "field.user = '7'",
          "field.'odd ''name' != 'x'", "field.status in [500, 1.5]"}) {
        EXPECT_EQ(ConditionVerdict::textOf(parsed(text)), text);
        EXPECT_EQ(parsed(ConditionVerdict::textOf(parsed(text))), parsed(text));
    }
}

TEST_F(ConditionVerdictTest, ReportsTheValueAndWhyTheConditionDoesNotHold) {
    struct Case {
        const char* condition;
        const char* description;
        const char* refusal; ///< empty: holds
    };
    for (const auto& [condition, description, refusal] : {
             Case{"ENTRYDESC = 'a'", "a", ""},
             Case{"ENTRYDESC = 'a'", "b", "ENTRYDESC 'b' is not 'a'"},
             Case{"ENTRYDESC = 'a'", "", "ENTRYDESC '' is not 'a'"},
             Case{"ENTRYDESC != 'a'", "b", ""},
             Case{"ENTRYDESC != 'a'", "a", "ENTRYDESC 'a' is 'a'"},
             Case{"ENTRYDESC >= 'b'", "b", ""},
             Case{"ENTRYDESC >= 'b'", "a", "ENTRYDESC 'a' is less than 'b'"},
             Case{"ENTRYDESC <= 'b'", "c", "ENTRYDESC 'c' is greater than 'b'"},
             Case{"ENTRYDESC < 'b'", "b", "ENTRYDESC 'b' is not less than 'b'"},
             Case{"ENTRYDESC > 'b'", "b", "ENTRYDESC 'b' is not greater than 'b'"},
             Case{"ENTRYDESC contains 'x'", "it's", "ENTRYDESC 'it''s' does not contain 'x'"},
             Case{"ENTRYDESC starts 'x'", "ax", "ENTRYDESC 'ax' does not start with 'x'"},
             Case{"ENTRYDESC matches 'x$'", "xa", "ENTRYDESC 'xa' does not match 'x$'"},
             Case{"ENTRYDESC in ['a', 'b']", "c", "ENTRYDESC 'c' is none of ['a', 'b']"},
             Case{"ENTRYDESC in ['a', 'b']", "b", ""},
         }) {
        const ConditionVerdict found = verdict(condition, description);
        EXPECT_EQ(found.holds, std::string(refusal).empty()) << condition;
        EXPECT_EQ(found.refusal, refusal);
        EXPECT_EQ(std::get<std::string>(found.value), description);
    }
    const ConditionVerdict number = verdict("SAMPLENO > 0", "");
    EXPECT_EQ(std::get<std::int64_t>(number.value), 0);
    EXPECT_EQ(number.refusal, "SAMPLENO 0 is not greater than 0");
}

} // namespace
