#include "host/http/RequestDispatcher.h"

#include "support/RecordingTrace.h"

#include <gtest/gtest.h>

#include <chrono>

using namespace zrm::host;

namespace {

using Kind = RequestStatistics::Kind;

class RequestDispatcherTest : public testing::Test {
protected:
    RequestDispatcher::Admission admitted() const {
        RequestDispatcher::Admission admission;
        admission.handler = &handler;
        admission.lane = Router::QUICK;
        admission.method = "GET";
        admission.route = "/a";
        admission.begin = std::chrono::steady_clock::now();
        return admission;
    }
    RecordingTrace trace{0};
    Router router;
    RequestDispatcher dispatcher{router};
    Router::Handler handler = [](const HttpRequest&) { return HttpAnswer::json("{}"); };
};

TEST_F(RequestDispatcherTest, CountsEachAnswer) {
    for (int request = 0; request < 3; ++request) {
        RequestDispatcher::Admission admission = admitted();
        EXPECT_EQ(dispatcher.answer(admission).status, 200);
    }
    const auto counts = dispatcher.statistics().counts();
    EXPECT_EQ(counts.size(), 1u);
    EXPECT_EQ(counts.at(Kind{"GET", "/a", 200}), 3u);
}

TEST_F(RequestDispatcherTest, DoesNotCountARequestAgainWhoseHandlerEndsAfterItsRefusal) {
    RequestDispatcher::Admission admission = admitted();
    EXPECT_EQ(dispatcher.refuse(admission, {503, "the request took too long", ""}).status, 503);
    EXPECT_EQ(dispatcher.answer(admission).status, 200);
    const auto counts = dispatcher.statistics().counts();
    EXPECT_EQ(counts.size(), 1u);
    EXPECT_EQ(counts.at(Kind{"GET", "/a", 503}), 1u);
    EXPECT_EQ(dispatcher.statistics().durations().at("/a").count, 1u);
}

} // namespace
