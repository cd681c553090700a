#include "host/framework/TraceControl.h"

#include "agent/framework/trace.h"

#include <gtest/gtest.h>

namespace {

TEST(TraceControl, ChangesTheGenerationWithTheLevels) {
    const unsigned before = TRC1_Generation;
    ASSERT_EQ(TraceControl::configure("fine"), "");
    EXPECT_NE(TRC1_Generation, before);
    EXPECT_EQ(TraceControl::levelOf("Any.cpp"), 0x01u);
    TraceControl::configure("");
}

TEST(TraceControl, ABadTextChangesNothing) {
    ASSERT_EQ(TraceControl::configure("fine"), "");
    const unsigned before = TRC1_Generation;
    EXPECT_EQ(TraceControl::configure("fine,loud"),
              "\"loud\" in \"loud\" is no trace class; the classes are error, flow, detail, fine, "
              "all, none, or a number from 0 to 255");
    EXPECT_EQ(TRC1_Generation, before);
    EXPECT_EQ(TraceControl::levelOf("Any.cpp"), 0x01u);
    TraceControl::configure("");
}

TEST(TraceControl, SkipsTheGenerationThatMeansNever) {
    TRC1_Generation = 0xffffffff;
    ASSERT_EQ(TraceControl::configure(""), "");
    EXPECT_EQ(TRC1_Generation, 1u);
}

TEST(TraceControl, SaysWhyAFileCannotBeOpened) {
    EXPECT_EQ(TraceControl::openFile("/nonexistent/trace"),
              "cannot open /nonexistent/trace: No such file or directory");
}

} // namespace
