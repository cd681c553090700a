#include "host/framework/TraceControl.h"

#include "framework/trace.h"

#include <gtest/gtest.h>

#include <atomic>
#include <string>
#include <thread>
#include <vector>

#include <malloc.h>

#include "support/ReasonOf.h"

using namespace zrm::host;

namespace {

TEST(TraceControl, ChangesTheGenerationWithTheLevels) {
    const unsigned before = TRC1_Generation;
    ASSERT_EQ(reasonOf(TraceControl::configure("fine")), "");
    EXPECT_NE(TRC1_Generation, before);
    EXPECT_EQ(TraceControl::levelOf("Any.cpp"), 0x01u);
    TraceControl::configure("");
}

TEST(TraceControl, ABadTextChangesNothing) {
    ASSERT_EQ(reasonOf(TraceControl::configure("fine")), "");
    const unsigned before = TRC1_Generation;
    EXPECT_EQ(
        reasonOf(TraceControl::configure("fine,loud")),
        "\"loud\" in \"loud\" is not a trace class; the classes are error, flow, detail, fine, "
        "all, none, or a number from 0 to 255");
    EXPECT_EQ(TRC1_Generation, before);
    EXPECT_EQ(TraceControl::levelOf("Any.cpp"), 0x01u);
    TraceControl::configure("");
}

/// Bytes that the process has allocated and not freed.
std::size_t bytesInUse() {
    return mallinfo2().uordblks;
}

TEST(TraceControl, KeepsNoEarlierLevels) {
    const auto change = [](int number) {
        std::string levels = "error";
        for (int unit = 0; unit < 300; ++unit) {
            levels += ",unit" + std::to_string(number) + "of" + std::to_string(unit) + "=all";
        }
        ASSERT_EQ(reasonOf(TraceControl::configure(levels)), "");
        EXPECT_EQ(TraceControl::levels(), levels);
    };
    change(1000);
    const std::size_t before = bytesInUse();
    for (int number = 1001; number < 1500; ++number) {
        change(number);
    }
#if !defined(__SANITIZE_ADDRESS__) && !defined(__SANITIZE_THREAD__)
    EXPECT_LT(bytesInUse(), before + 100'000); // each has more than 10,000
#else
    static_cast<void>(before); // what the sanitizers allocate is not counted
#endif
    TraceControl::configure("");
}

TEST(TraceControl, LevelsMayBeReadWhileTheyChange) {
    std::atomic<bool> ends{false};
    std::vector<std::thread> readers;
    for (int i = 0; i < 3; ++i) {
        readers.emplace_back([&] {
            while (!ends) {
                const unsigned level = TraceControl::levelOf("UnitOfSome.cpp");
                ASSERT_TRUE(level == 0x01 || level == 0x10 || level == 0x80) << level;
            }
        });
    }
    for (int turn = 0; turn < 100; ++turn) {
        TraceControl::configure(turn % 2 == 0 ? "error,UnitOfSome=fine"
                                              : "error,UnitOfSome=detail");
    }
    ends = true;
    for (std::thread& reader : readers) {
        reader.join();
    }
    TraceControl::configure("");
}

TEST(TraceControl, SkipsTheReservedGeneration) {
    TRC1_Generation = 0xffffffff;
    ASSERT_EQ(reasonOf(TraceControl::configure("")), "");
    EXPECT_EQ(TRC1_Generation, 1u);
}

TEST(TraceControl, ReportsWhyAFileCannotBeOpened) {
    EXPECT_EQ(reasonOf(TraceControl::openFile("/nonexistent/trace")),
              "cannot open /nonexistent/trace: No such file or directory");
}

} // namespace
