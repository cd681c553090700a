#include "host/framework/FieldCondition.h"

#include "base/EntryFields.h"
#include "framework/LogEntry.h"
#include "support/RecordingTrace.h"
#include "unit/host/framework/TestTable.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

/// An entry with the fields of a test, which counts how often they are read.
class FieldsEntry : public LogEntry {
public:
    std::string_view text() const override { return "text"; }
    bool isCut() const override { return false; }
    const EntryFields& fields() override {
        ++reads;
        return given;
    }
    const EntryKeep& keep() const override { return m_keep; }

    EntryFields given;
    int reads = 0;

private:
    const EntryKeep m_keep;
};

class FieldConditionTest : public testing::Test {
protected:
    FieldConditionTest() {
        entry.given.add("status", "500");
        entry.given.add("time", "1.50");
        entry.given.add("user", "root");
        entry.given.add("huge", "18446744073709551617");
        entry.given.add("id", "9007199254740993");
        entry.given.add("nothing", "");
    }
    static Condition on(const std::string& field, _IntfOper op, std::vector<std::string> values,
                        bool isNumber) {
        Condition condition;
        condition.column = "field." + field;
        condition.op = op;
        condition.isNumber = isNumber;
        if (op == INTF_IN) {
            condition.values = std::move(values);
        } else {
            condition.text = values.at(0);
        }
        return condition;
    }
    bool holds(const Condition& condition) {
        TestReceiver receiver;
        ContextInfo context{receiver};
        RequestDetail detail;
        detail.conditions = {condition};
        TestRequest request(&detail, &context, &manager);
        TestRow row("", "", "", 0);
        return request.CheckForException(row.bytes()) != 0;
    }
    bool number(const std::string& field, _IntfOper op, const std::string& value) {
        return holds(on(field, op, {value}, true));
    }
    bool text(const std::string& field, _IntfOper op, const std::string& value) {
        return holds(on(field, op, {value}, false));
    }

    RecordingTrace trace{TRC1_ERROR};
    TestManager manager;
    FieldsEntry entry;
    LogEntry::Offer offer{entry};
};

TEST_F(FieldConditionTest, NumbersCompareAsNumbers) {
    EXPECT_TRUE(number("status", INTF_GREATER_OR_EQUAL, "500"));
    EXPECT_TRUE(number("status", INTF_GREATER, "499.5"));
    EXPECT_TRUE(number("status", INTF_GREATER, "60")) << "as text it is less";
    EXPECT_FALSE(number("status", INTF_LESS, "500"));
    EXPECT_TRUE(number("status", INTF_NOT_EQUAL, "501"));
    EXPECT_TRUE(number("time", INTF_EQUAL, "1.5"));
    EXPECT_TRUE(number("time", INTF_GREATER, "1"));
    EXPECT_TRUE(number("time", INTF_LESS_OR_EQUAL, "15e-1"));
}

TEST_F(FieldConditionTest, WholeNumbersOf64BitsAreExactAndLargerOnesCompare) {
    EXPECT_FALSE(number("id", INTF_EQUAL, "9007199254740992"));
    EXPECT_TRUE(number("id", INTF_GREATER, "9007199254740992"));
    EXPECT_TRUE(number("huge", INTF_GREATER, "9223372036854775807"));
}

TEST_F(FieldConditionTest, TextsCompareByteByByte) {
    EXPECT_TRUE(text("user", INTF_EQUAL, "root"));
    EXPECT_FALSE(text("user", INTF_EQUAL, "root "));
    EXPECT_TRUE(text("status", INTF_LESS, "60"));
    EXPECT_FALSE(text("time", INTF_EQUAL, "1.5"));
    EXPECT_TRUE(text("user", INTF_CONTAINS, "oo"));
    EXPECT_TRUE(text("user", INTF_STARTS, "ro"));
    EXPECT_FALSE(text("user", INTF_STARTS, "rooty"));
    EXPECT_TRUE(text("user", INTF_MATCHES, "^r.*t$"));
    EXPECT_FALSE(text("user", INTF_MATCHES, "^o"));
    EXPECT_TRUE(text("nothing", INTF_EQUAL, ""));
}

TEST_F(FieldConditionTest, ListsOfTextsAndNumbers) {
    EXPECT_TRUE(holds(on("user", INTF_IN, {"admin", "root"}, false)));
    EXPECT_FALSE(holds(on("user", INTF_IN, {"admin", "roo"}, false)));
    EXPECT_TRUE(holds(on("status", INTF_IN, {"404", "5e2"}, true)));
    EXPECT_FALSE(holds(on("status", INTF_IN, {"404"}, true)));
}

TEST_F(FieldConditionTest, AnEntryWithoutTheFieldMeetsOnlyNotEqual) {
    EXPECT_TRUE(text("absent", INTF_NOT_EQUAL, "x"));
    EXPECT_TRUE(number("absent", INTF_NOT_EQUAL, "1"));
    EXPECT_FALSE(text("absent", INTF_EQUAL, ""));
    EXPECT_FALSE(text("absent", INTF_LESS, "x"));
    EXPECT_FALSE(text("absent", INTF_CONTAINS, ""));
    EXPECT_FALSE(text("absent", INTF_MATCHES, ""));
    EXPECT_FALSE(number("absent", INTF_LESS, "1"));
    EXPECT_FALSE(holds(on("absent", INTF_IN, {""}, false)));
}

TEST_F(FieldConditionTest, AFieldThatIsNotANumberMeetsOnlyNotEqualOfNumbers) {
    for (const char* const field : {"user", "nothing"}) {
        EXPECT_TRUE(number(field, INTF_NOT_EQUAL, "1")) << field;
        EXPECT_FALSE(number(field, INTF_LESS, "1")) << field;
        EXPECT_FALSE(number(field, INTF_EQUAL, "0")) << field;
        EXPECT_FALSE(holds(on(field, INTF_IN, {"0"}, true))) << field;
    }
}

TEST_F(FieldConditionTest, AThreadWithoutAnEntryHasNoFields) {
    LogEntry::ofThisThread = nullptr;
    EXPECT_FALSE(text("user", INTF_EQUAL, "root"));
    EXPECT_TRUE(text("user", INTF_NOT_EQUAL, "x"));
}

TEST_F(FieldConditionTest, FieldsAreReadOnlyWhereTheColumnsHold) {
    TestReceiver receiver;
    ContextInfo context{receiver};
    RequestDetail detail;
    detail.conditions = {on("user", INTF_EQUAL, {"root"}, false),
                         textCondition("TEXT", INTF_CONTAINS, "failed")};
    TestRequest request(&detail, &context, &manager);
    TestRow other("", "", "accepted", 0);
    EXPECT_EQ(request.CheckForException(other.bytes()), 0u);
    EXPECT_EQ(entry.reads, 0);
    TestRow row("", "", "failed", 0);
    EXPECT_EQ(request.CheckForException(row.bytes()), 1u);
    EXPECT_EQ(entry.reads, 1);
}

TEST_F(FieldConditionTest, APatternThatCannotBeUsedNeverHolds) {
    EXPECT_FALSE(text("user", INTF_MATCHES, "("));
    EXPECT_THAT(trace.messages(), testing::ElementsAre(testing::HasSubstr("for field user")));
}

TEST(FieldNumber, ReadsDecimalNumbersOnly) {
    for (const char* const text : {"0", "-5", "1.5", "-0.25", "1e3", "2E-2", ".5", "5."}) {
        EXPECT_TRUE(FieldNumber::of(text)) << text;
    }
    for (const char* const text :
         {"", " 1", "1 ", "+1", "0x10", "inf", "nan", "1,5", "1e999", "--1", "e", "-", "1.2.3"}) {
        EXPECT_FALSE(FieldNumber::of(text)) << text;
    }
}

} // namespace
