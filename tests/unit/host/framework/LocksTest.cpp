#include "framework/locks.h"

#include "base/LockGuard.h"
#include "support/Faults.h"

#include <gtest/gtest.h>

#include <csignal>
#include <thread>
#include <vector>

using namespace zrm;

namespace {

TEST(Locks, AdmitOneThreadAtATime) {
    SYS1_Lock lock;
    int inside = 0;
    int total = 0;
    std::vector<std::thread> threads;
    for (int i = 0; i < 4; ++i) {
        threads.emplace_back([&] {
            for (int round = 0; round < 5000; ++round) {
                const LockGuard guard(&lock);
                ASSERT_EQ(++inside, 1);
                ++total;
                --inside;
            }
        });
    }
    for (std::thread& thread : threads) {
        thread.join();
    }
    EXPECT_EQ(total, 20000);
}

TEST(LocksDeathTest, ALockThatCannotBeTakenEndsTheProcess) {
    EXPECT_EXIT(
        {
            SYS1_Lock lock;
            Fault fault("pthread_mutex_lock", EINVAL, {.times = -1});
            SYS1_GetLock(&lock);
        },
        testing::KilledBySignal(SIGABRT), "");
    EXPECT_EXIT(
        {
            SYS1_Lock lock;
            SYS1_GetLock(&lock);
            Fault fault("pthread_mutex_unlock", EPERM);
            SYS1_ReleaseLock(&lock);
        },
        testing::KilledBySignal(SIGABRT),
        "Error calling pthread_mutex_unlock\\(\\); Return code = 1; Operation not permitted");
}

} // namespace
