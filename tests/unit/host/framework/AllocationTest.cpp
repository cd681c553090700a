#include "framework/locale.h"
#include "framework/values.h"
#include "support/AllocationCount.h"
#include "unit/host/framework/TestTable.h"

#include <gtest/gtest.h>

#include <cstring>

using namespace zrm::host;

// What happens for every row and line must not allocate.

namespace {

/// Accepts rows without keeping them.
class Sink : public RowReceiver {
public:
    unsigned receive(const ctreq& /*request*/, const char* /*rows*/, unsigned count) override {
        rows += count;
        return 0;
    }
    void stopped(const ctreq& /*request*/, unsigned /*reason*/) override {}
    unsigned rows = 0;
};

TEST(Allocation, NoneForARowOfASituation) {
    TestManager manager;
    Sink sink;
    ContextInfo context{sink};
    RequestDetail detail;
    detail.conditions = {
        textCondition("LOGPATH", INTF_EQUAL, "/var/log/"),
        textCondition("LOGNAME", INTF_STARTS, "mess"),
        textCondition("TEXT", INTF_CONTAINS, "hello"),
        textCondition("TEXT", INTF_GREATER, "a"),
        listCondition("TEXT", {"one", "hello world"}),
        numberCondition("NUMBER", INTF_LESS, 1000),
    };
    TestRequest request(&detail, &context, &manager);
    TestRow row("/var/log/", "messages", "hello world", 7);
    long before = 0;
    for (int round = 0; round < 100; ++round) {
        // The first row compiles the conditions and allocates the space.
        if (round == 1) {
            before = allocationCount();
        }
        ASSERT_EQ(ctreq::UseHandle(request.handle()), &request);
        ASSERT_NE(request.CheckForException(row.bytes()), 0u);
        ASSERT_EQ(request.InsertRow(row.bytes()), 0u);
        ASSERT_EQ(request.Dispatch(), 0u);
        request.count = 0;
        RSC1_Drop(request.handle());
    }
    EXPECT_GT(before, 0) << "the count works";
    EXPECT_EQ(allocationCount(), before);
    EXPECT_EQ(sink.rows, 100u);
}

TEST(Allocation, NoneForAConversion) {
    char target[64];
    const auto convert = [&target](std::uint32_t from, const char* text) {
        return LOC2_TranslateString(LOC2_UTF8, target, sizeof target, from, text,
                                    static_cast<std::uint32_t>(std::strlen(text)), nullptr, 0,
                                    nullptr);
    };
    convert(819, "\xE9");
    const long before = allocationCount();
    for (int round = 0; round < 100; ++round) {
        ASSERT_EQ(convert(819, "caf\xE9 \xE8 \xFF"), 11);
        ASSERT_EQ(convert(LOC2_UTF8, "plain"), 5);
        ASSERT_EQ(convert(LOC2_UTF8, "bad \xFF\xFF"), 10);
        ASSERT_EQ(LOC2_GetLocaleNumInfo(LOC2_GetLocale(0, 0, 0, nullptr), 9, nullptr), 367u);
    }
    EXPECT_EQ(allocationCount(), before);
}

} // namespace
