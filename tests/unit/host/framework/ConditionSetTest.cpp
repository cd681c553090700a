#include "host/framework/ConditionSet.h"

#include "support/RecordingTrace.h"
#include "unit/host/framework/TestTable.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <clocale>
#include <memory>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class ConditionSetTest : public testing::Test {
protected:
    /// Whether the row meets the conditions.
    bool holds(std::vector<Condition> conditions, TestRow row) {
        open(std::move(conditions));
        return request->CheckForException(row.bytes()) != 0;
    }
    void open(std::vector<Condition> conditions) {
        request.reset();
        detail.conditions = std::move(conditions);
        request = std::make_unique<TestRequest>(&detail, &context, &manager);
        request->onForeignColumn = onForeignColumn;
    }
    bool textHolds(_IntfOper op, std::string value, std::string_view content) {
        return holds({textCondition("TEXT", op, std::move(value))}, TestRow("", "", content, 0));
    }

    TestManager manager;
    TestReceiver receiver;
    ContextInfo context{receiver};
    RequestDetail detail;
    std::unique_ptr<TestRequest> request;
    std::function<unsigned(char*, std::string, _IntfOper, char*)> onForeignColumn;
};

const TestRow rowBytes("/var/log/", "messages", "Failed password for root", 7);

TEST_F(ConditionSetTest, WithoutConditionsEveryRowMatches) {
    EXPECT_TRUE(holds({}, rowBytes));
}

TEST_F(ConditionSetTest, AllConditionsMustHold) {
    const auto path = textCondition("LOGPATH", INTF_EQUAL, "/var/log/");
    const auto name = textCondition("LOGNAME", INTF_EQUAL, "messages");
    const auto text = textCondition("TEXT", INTF_CONTAINS, "password");
    const auto number = numberCondition("NUMBER", INTF_GREATER_OR_EQUAL, 7);
    EXPECT_TRUE(holds({path, name, text, number}, rowBytes));
    EXPECT_FALSE(holds({path, name, text, numberCondition("NUMBER", INTF_GREATER, 7)}, rowBytes));
    EXPECT_FALSE(holds({path, textCondition("LOGNAME", INTF_EQUAL, "message"), text}, rowBytes));
    EXPECT_FALSE(holds({textCondition("LOGPATH", INTF_EQUAL, "/var/log"), name}, rowBytes));
}

TEST_F(ConditionSetTest, ContainsStartsMatchesAndIn) {
    EXPECT_TRUE(textHolds(INTF_CONTAINS, "pass", "Failed password"));
    EXPECT_FALSE(textHolds(INTF_CONTAINS, "Pass", "Failed password"));
    EXPECT_TRUE(textHolds(INTF_CONTAINS, "", ""));
    EXPECT_TRUE(textHolds(INTF_CONTAINS, "d p", "Failed password"));
    EXPECT_FALSE(textHolds(INTF_CONTAINS, "word ", "Failed password")) << "that is padding";
    EXPECT_TRUE(textHolds(INTF_CONTAINS, "word ", "Failed password for"));
    EXPECT_FALSE(textHolds(INTF_CONTAINS, "secret", std::string_view("none\0secret", 11)));
    EXPECT_TRUE(textHolds(INTF_STARTS, "Failed", "Failed password"));
    EXPECT_TRUE(textHolds(INTF_STARTS, "Failed ", "Failed password"));
    EXPECT_FALSE(textHolds(INTF_STARTS, "Failed ", "Failed"));
    EXPECT_FALSE(textHolds(INTF_STARTS, "ailed", "Failed"));
    EXPECT_FALSE(textHolds(INTF_STARTS, std::string(33, 'x'), std::string(32, 'x')));
    EXPECT_TRUE(textHolds(INTF_STARTS, std::string(32, 'x'), std::string(32, 'x')));
    EXPECT_TRUE(textHolds(INTF_MATCHES, "user=\\d+$", "login user=42"));
    EXPECT_FALSE(textHolds(INTF_MATCHES, "user=\\d+$", "login user=42 ok"));
    EXPECT_TRUE(textHolds(INTF_MATCHES, "(?i)LOGIN", "login user=42"));
    EXPECT_TRUE(textHolds(INTF_MATCHES, "^.{3}$", "äöü"));
    EXPECT_TRUE(holds({listCondition("TEXT", {"one", "two"})}, TestRow("", "", "two", 0)));
    EXPECT_TRUE(holds({listCondition("TEXT", {"one", "two  "})}, TestRow("", "", "two", 0)));
    EXPECT_TRUE(holds({listCondition("TEXT", {"one", ""})}, TestRow("", "", "", 0)));
    EXPECT_FALSE(holds({listCondition("TEXT", {"one", "two"})}, TestRow("", "", "tw", 0)));
    EXPECT_TRUE(holds({listCondition("NUMBER", {"1", "-7"}, true)}, TestRow("", "", "", -7)));
    EXPECT_FALSE(holds({listCondition("NUMBER", {"1", "x"}, true)}, TestRow("", "", "", 7)));
}

TEST_F(ConditionSetTest, ALongerValueIsCutToTheColumnsWidth) {
    EXPECT_TRUE(holds({textCondition("LOGNAME", INTF_EQUAL, "twelve_bytes_and_more")},
                      TestRow("", "twelve_bytes", "", 0)));
    // A UTF-8 column ends before a character that it cannot hold.
    const std::string full = std::string(31, 'x');
    EXPECT_TRUE(textHolds(INTF_EQUAL, full + "é and more", full));
    EXPECT_FALSE(textHolds(INTF_EQUAL, full + "y and more", full));
}

TEST_F(ConditionSetTest, NumbersAreComparedInFull) {
    const auto numberHolds = [this](_IntfOper op, std::int64_t value, std::int32_t column) {
        return holds({numberCondition("NUMBER", op, value)}, TestRow("", "", "", column));
    };
    EXPECT_TRUE(numberHolds(INTF_EQUAL, -1, -1));
    EXPECT_FALSE(numberHolds(INTF_EQUAL, 0xffffffff, -1));
    EXPECT_TRUE(numberHolds(INTF_LESS, 0x100000000, 0x7fffffff));
    EXPECT_TRUE(holds({textCondition("NUMBER", INTF_EQUAL, "7")}, rowBytes))
        << "digits mean a number";
}

TEST_F(ConditionSetTest, NonsensicalConditionsNeverHold) {
    EXPECT_FALSE(holds({textCondition("NUMBER", INTF_EQUAL, "seven")}, rowBytes));
    EXPECT_FALSE(holds({textCondition("NUMBER", INTF_NOT_EQUAL, "7 ")}, rowBytes));
    EXPECT_FALSE(holds({textCondition("NUMBER", INTF_CONTAINS, "7")}, rowBytes));
    EXPECT_FALSE(holds({numberCondition("TEXT", INTF_NOT_EQUAL, 7)}, rowBytes));
    EXPECT_FALSE(holds({textCondition("TEXT", static_cast<_IntfOper>(55), "x")}, rowBytes));
    EXPECT_FALSE(holds({numberCondition("NUMBER", static_cast<_IntfOper>(0), 7)}, rowBytes));
    EXPECT_FALSE(holds({textCondition("NOCOLUMN", INTF_NOT_EQUAL, "x")}, rowBytes));
}

TEST_F(ConditionSetTest, ABadPatternNeverHoldsAndIsReported) {
    RecordingTrace trace(TRC1_ERROR);
    EXPECT_FALSE(textHolds(INTF_MATCHES, "a(b", "a(b"));
    EXPECT_THAT(trace.messages(),
                ElementsAre("Pattern a(b for column TEXT cannot be used: missing ): a(b."));
    trace.clear();
    trace.setLevel(TRC1_DETAIL | TRC1_FINE);
    EXPECT_FALSE(textHolds(INTF_MATCHES, "a(b", "a(b"));
    EXPECT_THAT(trace.messages(), IsEmpty());
}

// In a single-byte code page, text need not be UTF-8, and a dot matches any byte.
TEST_F(ConditionSetTest, PatternsFollowTheCodePageOfTheColumn) {
    const TestRow latin("caf\xE9.log", "", "", 0);
    EXPECT_TRUE(holds({textCondition("LOGPATH", INTF_MATCHES, "^caf.\\.log$")}, latin));
    std::setlocale(LC_ALL, "C.UTF-8");
    EXPECT_FALSE(holds({textCondition("LOGPATH", INTF_MATCHES, "^caf.\\.log$")}, latin));
    EXPECT_TRUE(holds({textCondition("LOGPATH", INTF_MATCHES, "^caf.\\.log$")},
                      TestRow("caf\u00e9.log", "", "", 0)));
    std::setlocale(LC_ALL, "C");
}

TEST_F(ConditionSetTest, AsksTheTableAboutUndescribedColumns) {
    std::vector<std::string> asked;
    TestRow row = rowBytes;
    onForeignColumn = [&](char* bytes, std::string column, _IntfOper op, char* value) {
        EXPECT_EQ(bytes, row.bytes());
        asked.push_back(column + ' ' + std::to_string(op) + ' ' + std::string(value, 3));
        return column == "YES" ? 1u : 0u;
    };
    open({textCondition("YES", INTF_LESS, "abc")});
    EXPECT_NE(request->CheckForException(row.bytes()), 0u);
    open({textCondition("YES", INTF_LESS, "abc"), textCondition("NO", INTF_IN, "x")});
    EXPECT_EQ(request->CheckForException(row.bytes()), 0u);
    EXPECT_EQ(asked[0], "YES 5 abc");
}

// What is evaluated last is skipped when something cheaper refuses the row.
TEST_F(ConditionSetTest, TheLogIsCheckedFirst) {
    int asked = 0;
    onForeignColumn = [&](char*, const std::string&, _IntfOper, char*) {
        ++asked;
        return 1u;
    };
    const auto foreign = textCondition("FOREIGN", INTF_EQUAL, "x");
    EXPECT_FALSE(holds({foreign, textCondition("LOGNAME", INTF_EQUAL, "auth.log")}, rowBytes));
    EXPECT_FALSE(holds({foreign, textCondition("LOGPATH", INTF_EQUAL, "/var/")}, rowBytes));
    EXPECT_FALSE(holds({foreign, textCondition("TEXT", INTF_MATCHES, "nothing")}, rowBytes));
    EXPECT_FALSE(holds({foreign, textCondition("NUMBER", INTF_EQUAL, "x")}, rowBytes));
    EXPECT_EQ(asked, 0);
    EXPECT_TRUE(holds({foreign, textCondition("LOGNAME", INTF_EQUAL, "messages")}, rowBytes));
    EXPECT_EQ(asked, 1);
}

TEST_F(ConditionSetTest, RanksTheCheapAndSelectiveFirst) {
    const RowColumn logname{"LOGNAME", 0, 8, COLUMN_CHARACTER};
    const RowColumn logpath{"LOGPATH", 0, 8, COLUMN_CHARACTER};
    const RowColumn text{"TEXT", 0, 8, COLUMN_CHARACTER};
    const RowColumn number{"NUMBER", 0, 4, COLUMN_INTEGER};
    const std::int64_t seven = 7;
    const char* const bytes = reinterpret_cast<const char*>(&seven);
    const auto rank = [](const RowColumn* column, _IntfOper op, std::int16_t type,
                         const char* value) {
        const SEL1_FILTERINFO filter{"", op, type, static_cast<std::int16_t>(std::strlen(value)),
                                     value};
        return CompiledCondition(filter, column).rank();
    };
    const int ranks[] = {
        rank(&number, INTF_EQUAL, 452, "never holds"),
        rank(&logname, INTF_EQUAL, 452, "x"),
        rank(&logpath, INTF_EQUAL, 452, "x"),
        rank(&number, INTF_EQUAL, SEL1_INTEGER, bytes),
        rank(&number, INTF_IN, 452, "1\n2"),
        rank(&text, INTF_EQUAL, 452, "x"),
        rank(&logname, INTF_LESS, 452, "x"),
        rank(&text, INTF_IN, 452, "x\ny"),
        rank(&text, INTF_STARTS, 452, "x"),
        rank(&text, INTF_CONTAINS, 452, "x"),
        rank(&text, INTF_MATCHES, 452, "x"),
        rank(nullptr, INTF_EQUAL, 452, "x"),
    };
    for (std::size_t index = 1; index < std::size(ranks); ++index) {
        EXPECT_LT(ranks[index - 1], ranks[index]) << index;
    }
}

} // namespace
