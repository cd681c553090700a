#include "host/start/Serving.h"

#include "framework/EventRoom.h"
#include "framework/locks.h"
#include "host/framework/EventRoomControl.h"
#include "host/framework/Tables.h"
#include "host/start/Watchdog.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"
#include "unit/host/framework/TestTable.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <thread>

#include <unistd.h>

using namespace zrm;
using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using Clock = Serving::Clock;

class ServingTest : public testing::Test {
protected:
    ServingTest() {
        TableManager::RegisterWithManager(&logs);
        logs.onCreate = [this](TestRequest&) { ++logSamples; };
        config.stateDirectory = directory.file("state");
        config.sinks = {SinkConfig::jsonl(output)};
        config.situations = {{"every", "", "info", {}}};
    }
    ~ServingTest() override { Tables::clear(); }

    /// A log's thread that offers rows until one is refused.
    unsigned arrive() {
        unsigned status = 0;
        SYS1_GetLock(entries.lock());
        LinkedListIter walk(entries.requests());
        while (void* const element = walk.Next()) {
            TestRow row("/var/log/", "app.log", "text", 7);
            auto* const request = static_cast<ctreq*>(element);
            request->InsertRow(row.bytes());
            status = request->Dispatch();
            request->count = 0;
        }
        SYS1_ReleaseLock(entries.lock());
        return status;
    }
    int lines() const {
        std::ifstream stream(output);
        return static_cast<int>(std::count(std::istreambuf_iterator<char>(stream), {}, '\n'));
    }

    RecordingTrace trace{0};
    TemporaryDirectory directory;
    std::string output = directory.file("events.jsonl");
    HostConfig config;
    TestManager entries{"RMLOGENT"};
    TestManager logs{"RMMONLOG"};
    int logSamples = 0;
    Watchdog watchdog; // not started: it watches a whole process
};

TEST_F(ServingTest, DeliversEventsFromStartToStop) {
    const auto serving = Serving::begin(config, entries, watchdog, openHistory(config));
    ASSERT_NE(serving, nullptr);
    EXPECT_EQ(arrive(), 0u);
    EXPECT_EQ(arrive(), 0u);
    serving->stop(Clock::now() + 10s);
    EXPECT_EQ(lines(), 2);
    arrive(); // nobody receives it any more
    EXPECT_EQ(lines(), 2);
}

TEST_F(ServingTest, TakesASampleOfTheLogsAtOnce) {
    const auto serving = Serving::begin(config, entries, watchdog, openHistory(config));
    EXPECT_EQ(logSamples, 1);
    serving->stop(Clock::now() + 10s);
}

TEST_F(ServingTest, ATableThatOpensNoRequestIsAFailure) {
    trace.setLevel(TRC1_ERROR);
    entries.gives = false;
    EXPECT_EQ(Serving::begin(config, entries, watchdog, openHistory(config)), nullptr);
    EXPECT_THAT(trace.messages(), testing::ElementsAre("The Log Entries table opens no request."));
}

TEST_F(ServingTest, CountsTheMonitoredLogs) {
    logs.onCreate = [](TestRequest& created) {
        created.onSample = [](TestRequest& request) {
            TestRow row("/var/log/", "app.log", "Running", 0);
            request.InsertRow(row.bytes());
            request.InsertRow(row.bytes());
        };
    };
    EXPECT_EQ(Serving::countLogs(), 2u);
    Tables::clear();
    EXPECT_EQ(Serving::countLogs(), 0u);
}

TEST_F(ServingTest, AStopReleasesAWaitingLogAndEndsAtItsLimit) {
    config.history.enabled = false; // only the queue holds events
    config.sinks = {SinkConfig::jsonl("/dev/full")};
    const auto serving = Serving::begin(config, entries, watchdog, openHistory(config));
    std::atomic<int> taken{0};
    std::thread log([&] {
        while (EventRoom::wait([] { return true; }) != EventRoom::State::CLOSED) {
            EXPECT_EQ(arrive(), 0u);
            ++taken;
        }
        EventRoom::notePassedOver(7);
    });
    while (EventRoomControl::waits().count == 0) { // the queue is full, and the log waits
        std::this_thread::sleep_for(1ms);
    }
    testing::internal::CaptureStderr();
    const auto begin = Clock::now();
    serving->stop(begin + 200ms);
    EXPECT_LT(Clock::now() - begin, 5s);
    log.join();
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "zrmagent: " + std::to_string(taken) +
                  " events were not delivered to /dev/full\n"
                  "zrmagent: 7 lines that were waiting in the logs were not read; reports will "
                  "find them\n");
}

TEST_F(ServingTest, AnotherThreadMayReleaseTheLogsAndDeliverTheRest) {
    const auto serving = Serving::begin(config, entries, watchdog, openHistory(config));
    arrive();
    EventRoomControl::close();
    serving->abandonHttp(Clock::now() + 10s);
    EXPECT_EQ(arrive(), 0u) << "there is room";
    serving->deliverRest(Clock::now() + 10s);
    EXPECT_EQ(lines(), 2);
    EXPECT_NE(arrive(), 0u);
}

TEST_F(ServingTest, ReportsTheAddressOfHttp) {
    config.http.listen = ListenAddress{"127.0.0.1", 0};
    const auto serving = Serving::begin(config, entries, watchdog, openHistory(config));
    testing::internal::CaptureStderr();
    serving->startHttp(config);
    EXPECT_THAT(testing::internal::GetCapturedStderr(),
                testing::MatchesRegex("zrmagent: HTTP at http://127.0.0.1:[0-9]+/, token in " +
                                      directory.file("state/api-token") + "\n"));
    EXPECT_TRUE(std::filesystem::exists(directory.file("state/api-token")));
    serving->stop(Clock::now() + 10s);
}

TEST_F(ServingTest, WithoutATokenOnlyHttpIsOff) {
    config.http.listen = ListenAddress{"127.0.0.1", 0};
    config.http.tokenFile = directory.file("no/such/token");
    const auto serving = Serving::begin(config, entries, watchdog, openHistory(config));
    testing::internal::CaptureStderr();
    serving->startHttp(config);
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "zrmagent: HTTP is off: cannot create the directory " + directory.file("no/such") +
                  ": No such file or directory\n");
    EXPECT_EQ(arrive(), 0u);
    serving->stop(Clock::now() + 10s);
    EXPECT_EQ(lines(), 1);
}

TEST_F(ServingTest, UndeliveredEventsAreKeptForTheNextStart) {
    const std::vector<SinkConfig> good = config.sinks;
    config.sinks = {SinkConfig::jsonl(directory.file("no/such/directory/events.jsonl"))};
    auto serving = Serving::begin(config, entries, watchdog, openHistory(config));
    EXPECT_EQ(arrive(), 0u);
    testing::internal::CaptureStderr();
    serving->stop(Clock::now() + 50ms);
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "zrmagent: 1 events were not delivered to " +
                  directory.file("no/such/directory/events.jsonl") +
                  "; it will get them when the agent runs again\n");
    serving.reset();
    std::filesystem::create_directories(directory.file("no/such/directory"));
    serving = Serving::begin(config, entries, watchdog, openHistory(config));
    EXPECT_EQ(arrive(), 0u);
    serving->stop(Clock::now() + 10s);
    std::ifstream stream(directory.file("no/such/directory/events.jsonl"));
    EXPECT_EQ(std::count(std::istreambuf_iterator<char>(stream), {}, '\n'), 2);
}

TEST_F(ServingTest, ATickRecordsTheMinuteThatIsOver) {
    const auto serving = Serving::begin(config, entries, watchdog, openHistory(config));
    const int before = logSamples;
    serving->tick();
    EXPECT_EQ(logSamples, before) << "no minute is over yet";
    serving->stop(Clock::now() + 10s);
    EXPECT_EQ(logSamples, before + 1) << "the minute ends with the agent";
}

TEST_F(ServingTest, WithoutAnAddressThereIsNoHttp) {
    const auto serving = Serving::begin(config, entries, watchdog, openHistory(config));
    testing::internal::CaptureStderr();
    serving->startHttp(config);
    EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
    EXPECT_FALSE(std::filesystem::exists(directory.file("state/api-token")));
    serving->stop(Clock::now() + 10s);
}

} // namespace
