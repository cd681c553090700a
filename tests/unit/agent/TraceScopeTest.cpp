#include "agent/TraceScope.h"

#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

namespace {

TRC1_Anchor anchor{"TraceScopeTest.cpp"};

int traced(int value) {
    TraceScope trace(anchor);
    trace.error()("error %d", value);
    trace.detail()("detail %d", value);
    trace.fine()("fine %d", value);
    trace.always()("always %d", value);
    return trace.result(value);
}

using testing::ElementsAre;

TEST(TraceScope, WritesOnlyTheClassesThatAreOn) {
    RecordingTrace trace(TRC1_ERROR);
    traced(1);
    EXPECT_THAT(trace.messages(), ElementsAre("error 1", "always 1"));
    trace.clear();
    trace.setLevel(TRC1_DETAIL | TRC1_FINE);
    traced(2);
    EXPECT_THAT(trace.messages(), ElementsAre("detail 2", "fine 2", "always 2"));
    EXPECT_THAT(trace.events(), ElementsAre());
}

TEST(TraceScope, FlowClassWritesEntryAndExitWithTheResult) {
    RecordingTrace trace(TRC1_FLOW);
    traced(7);
    { TraceScope scope(anchor); }
    EXPECT_THAT(trace.events(), ElementsAre("TraceScopeTest.cpp entry", "TraceScopeTest.cpp exit 7",
                                            "TraceScopeTest.cpp entry", "TraceScopeTest.cpp exit"));
}

} // namespace
