#include "host/history/RequestedChanges.h"

#include "host/history/HistoryFile.h"
#include "support/ReasonOf.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <string>
#include <thread>

#include <sqlite3.h>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;

class RequestedChangesTest : public testing::Test {
protected:
    /// Waits until a change is waiting.
    void waitForRequest() {
        while (!changes.areWaiting()) {
            std::this_thread::sleep_for(1ms);
        }
    }

    TemporaryDirectory directory;
    HistoryFile file{directory.file("history.db")};
    std::atomic<int> wakes{0};
    RequestedChanges changes{[this] { ++wakes; }};
    std::string reason;
};

TEST_F(RequestedChangesTest, AreMadeByTheWriterWhileTheCallerWaits) {
    int made = 0;
    std::thread caller([&] { reason = reasonOf(changes.make([&](HistoryFile&) { ++made; }, 1h)); });
    waitForRequest();
    changes.run(file);
    caller.join();
    EXPECT_EQ(made, 1);
    EXPECT_EQ(reason, "");
    EXPECT_EQ(wakes, 1);
    EXPECT_FALSE(changes.areWaiting());
}

TEST_F(RequestedChangesTest, OneForWhichThereIsNoTimeIsNotMadeLater) {
    int made = 0;
    reason = reasonOf(changes.make([&](HistoryFile&) { ++made; }, 1ms));
    EXPECT_EQ(reason, "the history cannot be written now; try again");
    changes.run(file);
    EXPECT_EQ(made, 0);
}

TEST_F(RequestedChangesTest, OneThatTakesTooLongMayStillBeMade) {
    std::atomic<bool> isOver = false;
    std::thread caller([&] {
        reason = reasonOf(changes.make(
            [&](HistoryFile&) {
                while (!isOver) {
                    std::this_thread::sleep_for(1ms);
                }
            },
            50ms));
        isOver = true;
    });
    waitForRequest();
    changes.run(file);
    caller.join();
    EXPECT_EQ(reason, "the history is being written for long; look whether the change was made");
}

TEST_F(RequestedChangesTest, TheReasonOfAFailureReachesTheCallerAndTheWriter) {
    std::thread caller([&] {
        reason = reasonOf(
            changes.make([](HistoryFile&) { throw DatabaseError(nullptr, SQLITE_FULL); }, 1h));
    });
    waitForRequest();
    EXPECT_THROW(changes.run(file), DatabaseError);
    caller.join();
    EXPECT_TRUE(reason.starts_with("the history cannot be written: ")) << reason;
}

TEST_F(RequestedChangesTest, AreRefusedWhereThereIsNoFileAndAfterTheEnd) {
    std::thread caller([&] { reason = reasonOf(changes.make([](HistoryFile&) {}, 1h)); });
    waitForRequest();
    changes.refuseAll("no such directory");
    caller.join();
    EXPECT_EQ(reason, "the history cannot be written: no such directory");
    std::thread last([&] { reason = reasonOf(changes.make([](HistoryFile&) {}, 1h)); });
    waitForRequest();
    changes.end();
    last.join();
    EXPECT_EQ(reason, "the history cannot be written: it has ended");
    EXPECT_EQ(reasonOf(changes.make([](HistoryFile&) {}, 1h)), "the history has ended");
}

} // namespace
