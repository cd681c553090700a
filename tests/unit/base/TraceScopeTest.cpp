#include "base/TraceScope.h"

#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <cstdint>
#include <string>

using namespace zrm;

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

const char* tracedPointer(const char* value) {
    TraceScope trace(anchor);
    return trace.result(value);
}

TEST(TraceScope, AnExitOfAPointerCarriesItsAddress) {
    RecordingTrace trace(TRC1_FLOW);
    const char* const text = "text";
    tracedPointer(text);
    tracedPointer(nullptr);
    const auto address = std::to_string(reinterpret_cast<std::intptr_t>(text));
    EXPECT_THAT(trace.events(),
                ElementsAre("TraceScopeTest.cpp entry", "TraceScopeTest.cpp exit " + address,
                            "TraceScopeTest.cpp entry", "TraceScopeTest.cpp exit 0"));
}

} // namespace
