#include "host/cli/StopSignals.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <csignal>

#include <unistd.h>

using namespace zrm::host;

using namespace std::chrono_literals;

TEST(StopSignalsTest, AWaitWithoutASignalTimesOut) {
    StopSignals signals;
    EXPECT_FALSE(signals.wait(1ms));
    EXPECT_FALSE(signals.isStopped());
}

TEST(StopSignalsTest, ASignalEndsTheWaitAndRunsTheAction) {
    for (const int number : {SIGINT, SIGTERM}) {
        StopSignals signals;
        std::atomic<int> stops{0};
        signals.onStop([&] { ++stops; });
        kill(getpid(), number);
        EXPECT_TRUE(signals.wait(60s));
        EXPECT_TRUE(signals.isStopped());
        signals.onStop({}); // waits for the action
        EXPECT_EQ(stops, 1);
    }
}

TEST(StopSignalsTest, ALateActionRunsAtOnce) {
    StopSignals signals;
    kill(getpid(), SIGINT);
    ASSERT_TRUE(signals.wait(60s));
    int stops = 0;
    signals.onStop([&] { ++stops; });
    EXPECT_EQ(stops, 1);
}

TEST(StopSignalsTest, RestoresTheSignals) {
    { StopSignals signals; }
    sigset_t blocked;
    pthread_sigmask(SIG_SETMASK, nullptr, &blocked);
    EXPECT_EQ(sigismember(&blocked, SIGINT), 0);
    EXPECT_EQ(sigismember(&blocked, SIGTERM), 0);
}
