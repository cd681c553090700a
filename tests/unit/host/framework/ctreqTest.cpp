#include "framework/ctreq.h"

#include "support/Faults.h"
#include "support/RecordingTrace.h"
#include "unit/host/framework/TestTable.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cerrno>
#include <memory>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

/// One request of the test table, opened without the host's Request.
class CtreqTest : public testing::Test {
protected:
    TestRequest& open(std::vector<Condition> conditions = {}) {
        detail.name = "situation";
        detail.interval = 60;
        detail.conditions = std::move(conditions);
        request = std::make_unique<TestRequest>(&detail, &context, &manager);
        return *request;
    }
    void insert(int number, unsigned expected = 0) {
        TestRow row("/var/log/", "messages", "text", number);
        EXPECT_EQ(request->InsertRow(row.bytes()), expected);
    }

    TestManager manager;
    TestReceiver receiver;
    ContextInfo context{receiver};
    RequestDetail detail;
    std::unique_ptr<TestRequest> request;
};

TEST_F(CtreqTest, ReturnsWhatItWasOpenedWith) {
    const TestRequest& opened = open();
    EXPECT_STREQ(opened.name(), "situation");
    EXPECT_EQ(opened.sampleType(), 4u);
    EXPECT_EQ(opened.interval(), 60u);
    EXPECT_EQ(opened.manager(), &manager);
    EXPECT_NE(opened.handle(), 0u);
    EXPECT_EQ(opened.count, 0u);
    EXPECT_EQ(opened.allocated, 0u);
}

TEST_F(CtreqTest, HasDefaultsForOptionalOperations) {
    class Bare : public ctreq {
    public:
        using ctreq::ctreq;
        void TakeSample() override {}
    };
    Bare bare(&detail, &context, &manager);
    ColumnInfo info{};
    char text[] = "";
    EXPECT_EQ(bare.NumColumns(), 0);
    EXPECT_NE(bare.GetColumnInfo(&info, 0), 0u);
    EXPECT_NE(bare.ExecuteCommand(text, 0, text), 0u);
    EXPECT_EQ(bare.ColumnIsException(text, text, INTF_EQUAL, text), 0u);
    EXPECT_NE(bare.InsertRow(text), 0u) << "without a row size nothing can be kept";
    bare.CommandCompleted(nullptr);
}

TEST_F(CtreqTest, GrowsTheDataArrayByTheTablesStep) {
    open();
    for (int number = 0; number < 20; ++number) {
        insert(number);
        EXPECT_EQ(request->count, static_cast<unsigned>(number + 1));
        EXPECT_EQ(request->allocated, static_cast<unsigned>(number / 3 * 3 + 3));
    }
    request->Dispatch();
    EXPECT_THAT(receiver.numbers,
                ElementsAre(0, 1, 2, 3, 4, 5, 6, 7, 8, 9, 10, 11, 12, 13, 14, 15, 16, 17, 18, 19));
}

TEST_F(CtreqTest, ReusesTheSpaceAfterTheCountWasReset) {
    open();
    insert(1);
    insert(2);
    const char* const rows = request->rows();
    EXPECT_EQ(request->Dispatch(), 0u);
    request->count = 0;
    Fault fault("new", ENOMEM, {.times = -1});
    insert(3);
    EXPECT_EQ(request->rows(), rows);
    EXPECT_EQ(fault.calls(), 0) << "no allocation while there is room";
    request->Dispatch();
    EXPECT_THAT(receiver.numbers, ElementsAre(1, 2, 3));
}

TEST_F(CtreqTest, AnInsertWithoutMemoryFailsAndKeepsTheRows) {
    open();
    insert(1);
    insert(2);
    insert(3);
    {
        Fault fault("new", ENOMEM);
        TestRow row("", "", "", 4);
        EXPECT_NE(request->InsertRow(row.bytes()), 0u);
        EXPECT_EQ(request->count, 3u);
        EXPECT_EQ(request->allocated, 3u);
    }
    insert(5);
    request->Dispatch();
    EXPECT_THAT(receiver.numbers, ElementsAre(1, 2, 3, 5));
}

TEST_F(CtreqTest, DispatchesNothingWhenThereIsNothing) {
    open();
    EXPECT_EQ(request->Dispatch(), 0u);
    EXPECT_EQ(receiver.dispatches, 0);
}

TEST_F(CtreqTest, PassesTheReceiversStatusOn) {
    open();
    insert(1);
    receiver.status = 99;
    EXPECT_EQ(request->Dispatch(), 99u);
    EXPECT_EQ(request->count, 1u) << "only the agent resets the count";
}

TEST_F(CtreqTest, PublishesTheConditionsOneAtATime) {
    open({textCondition("LOGPATH", INTF_EQUAL, "/var/log/"),
          numberCondition("NUMBER", INTF_LESS, -5), listCondition("TEXT", {"a", "", "b"})});
    SEL1_FILTERINFO* filter = nullptr;
    for (int walk = 0; walk < 2; ++walk) {
        request->ResetFilterIndex();
        ASSERT_EQ(request->GetFilterInfo(&filter), 0u);
        EXPECT_STREQ(filter->columnName, "LOGPATH");
        EXPECT_EQ(filter->compareOperator, INTF_EQUAL);
        EXPECT_NE(filter->dataType, SEL1_INTEGER);
        EXPECT_EQ(filter->valueLength, 9);
        EXPECT_EQ(std::string(filter->value, 16), std::string("/var/log/") + std::string(7, '\0'));
        ASSERT_EQ(request->GetFilterInfo(&filter), 0u);
        EXPECT_STREQ(filter->columnName, "NUMBER");
        EXPECT_EQ(filter->dataType, 496);
        EXPECT_EQ(filter->valueLength, 8);
        std::int64_t number = 0;
        std::memcpy(&number, filter->value, sizeof number);
        EXPECT_EQ(number, -5);
        ASSERT_EQ(request->GetFilterInfo(&filter), 0u);
        EXPECT_EQ(filter->compareOperator, INTF_IN);
        EXPECT_EQ(std::string(filter->value, static_cast<std::size_t>(filter->valueLength)),
                  "a\n\nb");
        SEL1_FILTERINFO* const last = filter;
        EXPECT_NE(request->GetFilterInfo(&filter), 0u);
        EXPECT_NE(request->GetFilterInfo(&filter), 0u);
        EXPECT_EQ(filter, last);
    }
}

TEST_F(CtreqTest, CutsAPublishedTextAtANulAndAtItsGreatestLength) {
    open({textCondition("TEXT", INTF_EQUAL, std::string("ab\0cd", 5)),
          textCondition("TEXT", INTF_EQUAL, std::string(40000, 'x'))});
    SEL1_FILTERINFO* filter = nullptr;
    ASSERT_EQ(request->GetFilterInfo(&filter), 0u);
    EXPECT_EQ(filter->valueLength, 2);
    ASSERT_EQ(request->GetFilterInfo(&filter), 0u);
    EXPECT_EQ(filter->valueLength, 32767);
}

TEST_F(CtreqTest, ARequestThatIsStoppedTakesNoMoreRows) {
    open();
    TestRow row("", "", "", 1);
    EXPECT_NE(request->CheckForException(row.bytes()), 0u);
    EXPECT_EQ(request->Stopped(1), 0u);
    EXPECT_EQ(request->Stop(), 0u);
    EXPECT_EQ(request->Stopped(2), 0u);
    EXPECT_THAT(receiver.reasons, ElementsAre(1)) << "reported once";
    EXPECT_EQ(request->CheckForException(row.bytes()), 0u);
}

TEST_F(CtreqTest, DumpsItsConditions) {
    RecordingTrace trace(TRC1_DETAIL);
    open({textCondition("LOGPATH", INTF_EQUAL, "/var/log/"),
          numberCondition("NUMBER", INTF_GREATER, 7)});
    request->DumpThresholds();
    EXPECT_THAT(trace.messages(), ElementsAre("\t_filter LOGPATH op=1 value=\"/var/log/\"\n",
                                              "\t_filter NUMBER op=6 value=7\n"));
    trace.clear();
    request->ctreq::PrintSelf();
    EXPECT_EQ(trace.messages().size(), 3u);
    trace.clear();
    trace.setLevel(TRC1_ERROR);
    request->ctreq::PrintSelf();
    EXPECT_THAT(trace.messages(), IsEmpty());
}

TEST_F(CtreqTest, ComparesCharacterColumns) {
    open();
    const auto holds = [this](_IntfOper op, const char* column, const char* value) {
        return request->IsException(op, column, value, 8) != 0;
    };
    EXPECT_TRUE(holds(INTF_EQUAL, "abc     ", "abc"));
    EXPECT_TRUE(holds(INTF_EQUAL, "abc\0zzzz", "abc   "));
    EXPECT_TRUE(holds(INTF_EQUAL, "abcdefgh", "abcdefgh"));
    EXPECT_TRUE(holds(INTF_EQUAL, "abcdefgh", "abcdefgh and more"))
        << "the column cannot hold more";
    EXPECT_FALSE(holds(INTF_EQUAL, "abcd    ", "abc"));
    EXPECT_FALSE(holds(INTF_EQUAL, "abc     ", "Abc"));
    EXPECT_TRUE(holds(INTF_EQUAL, "        ", ""));
    EXPECT_TRUE(holds(INTF_NOT_EQUAL, "abd     ", "abc"));
    EXPECT_FALSE(holds(INTF_NOT_EQUAL, "abc     ", "abc"));
    EXPECT_TRUE(holds(INTF_LESS, "abb     ", "abc"));
    EXPECT_FALSE(holds(INTF_LESS, "abc     ", "abc"));
    EXPECT_TRUE(holds(INTF_LESS_OR_EQUAL, "abc     ", "abc"));
    EXPECT_TRUE(holds(INTF_GREATER_OR_EQUAL, "abc     ", "abc"));
    EXPECT_TRUE(holds(INTF_GREATER, "abd     ", "abc"));
    EXPECT_FALSE(holds(INTF_GREATER, "abc     ", "abc"));
    EXPECT_TRUE(holds(INTF_CONTAINS, "abcdefgh", "cde"));
    EXPECT_TRUE(holds(INTF_STARTS, "abcdefgh", "abc"));
    EXPECT_TRUE(holds(INTF_MATCHES, "abcdefgh", "^a.*h$"));
    EXPECT_TRUE(holds(INTF_IN, "b       ", "a\nb"));
    EXPECT_FALSE(holds(static_cast<_IntfOper>(77), "abc     ", "abc"));
}

TEST_F(CtreqTest, ComparesIntegerColumns) {
    open();
    const auto holds = [this](_IntfOper op, int column, std::int64_t number) {
        char unaligned[9];
        std::memcpy(unaligned + 1, &number, sizeof number);
        return request->IsException(op, column, unaligned + 1) != 0;
    };
    EXPECT_TRUE(holds(INTF_EQUAL, 5, 5));
    EXPECT_FALSE(holds(INTF_EQUAL, 5, 5 + (std::int64_t{1} << 32)));
    EXPECT_TRUE(holds(INTF_NOT_EQUAL, 5, 6));
    EXPECT_TRUE(holds(INTF_GREATER_OR_EQUAL, 5, 5));
    EXPECT_TRUE(holds(INTF_LESS_OR_EQUAL, 5, 5));
    EXPECT_TRUE(holds(INTF_LESS, -5, 5));
    EXPECT_FALSE(holds(INTF_LESS, 5, 5));
    EXPECT_TRUE(holds(INTF_GREATER, 5, -5));
    EXPECT_FALSE(holds(INTF_GREATER, 5, 5));
    EXPECT_FALSE(holds(INTF_CONTAINS, 5, 5));
    EXPECT_NE(request->IsException(INTF_IN, 5, "4\n5"), 0);
    EXPECT_EQ(request->IsException(INTF_IN, 5, "4\n6"), 0);
}

} // namespace
