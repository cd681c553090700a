#include "host/delivery/Delivery.h"

#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"
#include "unit/host/events/TestEvents.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <cstdio>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <string>
#include <thread>
#include <vector>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using Clock = EventQueue::Clock;

class DeliveryTest : public testing::Test {
protected:
    void push(Delivery& delivery, const std::string& text) {
        TestRow row("/var/log/", "app.log", text, 7);
        EXPECT_TRUE(delivery.queue().push(label, row.bytes()));
    }
    static int lines(const std::string& path) {
        std::ifstream stream(path);
        return static_cast<int>(std::count(std::istreambuf_iterator<char>(stream), {}, '\n'));
    }

    /// A configuration with these sinks, which write to the given files.
    HostConfig configFor(const std::vector<std::string>& files, bool history = true) const {
        HostConfig config;
        config.stateDirectory = directory.file("state");
        config.history.enabled = history;
        config.sinks.clear();
        for (const std::string& file : files) {
            config.sinks.push_back(SinkConfig::jsonl(file));
        }
        return config;
    }

    RecordingTrace trace{0};
    TemporaryDirectory directory;
    std::shared_ptr<const SituationLabel> label =
        std::make_shared<const SituationLabel>(SituationLabel{"watch", "minor"});
};

TEST_F(DeliveryTest, EverySinkGetsEveryEventWithAndWithoutAHistory) {
    for (const bool history : {true, false}) {
        const std::string first = directory.file("a.jsonl");
        const std::string second = directory.file("b.jsonl");
        std::remove(first.c_str());
        std::remove(second.c_str());
        const HostConfig used = configFor({first, second}, history);
        Delivery delivery(used, testLayout(), sizeof(TestRow), openHistory(used));
        EXPECT_EQ(delivery.history() != nullptr, history);
        delivery.start();
        for (int number = 0; number < 100; ++number) {
            push(delivery, std::to_string(number));
        }
        testing::internal::CaptureStderr();
        delivery.finish(Clock::now() + 10s);
        delivery.finish(Clock::now() + 10s);
        EXPECT_EQ(testing::internal::GetCapturedStderr(), "");
        EXPECT_EQ(lines(first), 100);
        EXPECT_EQ(lines(second), 100);
    }
}

TEST_F(DeliveryTest, GoesOnBehindTheReservedIdsWhereTheHistoryCannotBeOpened) {
    const std::string file = directory.file("a.jsonl");
    const HostConfig config = configFor({file});
    std::filesystem::create_directories(config.stateDirectory + "/history.db"); // not a file
    std::ofstream(config.stateDirectory + "/history.lock") << "00000000000000065536\n";
    testing::internal::CaptureStderr();
    {
        Delivery delivery(config, testLayout(), sizeof(TestRow), openHistory(config));
        ASSERT_EQ(delivery.history(), nullptr);
        delivery.start();
        push(delivery, "a");
        delivery.finish(Clock::now() + 10s);
    }
    EXPECT_TRUE(
        testing::internal::GetCapturedStderr().starts_with("zrmagent: the history is off: "));
    std::string line;
    std::getline(std::ifstream(file), line);
    EXPECT_TRUE(line.starts_with("{\"id\":65537,")) << line;
}

TEST_F(DeliveryTest, ReportsWhatWasNotDelivered) {
    const std::string good = directory.file("good.jsonl");
    const HostConfig used = configFor({"/dev/full", good}, false);
    Delivery delivery(used, testLayout(), sizeof(TestRow), openHistory(used));
    delivery.start();
    push(delivery, "a");
    push(delivery, "b");
    testing::internal::CaptureStderr();
    delivery.finish(Clock::now() + 50ms);
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "zrmagent: 2 events were not delivered to /dev/full\n");
    EXPECT_EQ(lines(good), 2);
}

TEST_F(DeliveryTest, ASinkThatIsDownDelaysNeitherTheOthersNorTheQueue) {
    const std::string good = directory.file("good.jsonl");
    const HostConfig used = configFor({"/dev/full", good});
    Delivery delivery(used, testLayout(), sizeof(TestRow), openHistory(used));
    delivery.start();
    const int more = 3 * static_cast<int>(delivery.queueState().capacity);
    for (int number = 0; number < more; ++number) {
        push(delivery, std::to_string(number));
    }
    testing::internal::CaptureStderr();
    const auto limit = Clock::now() + 10s;
    while (delivery.sinkStates()[1].delivered < static_cast<std::uint64_t>(more) &&
           Clock::now() < limit) {
        std::this_thread::sleep_for(1ms);
    }
    EXPECT_EQ(lines(good), more);
    EXPECT_STREQ(delivery.sinkStates()[0].conditionName(), "failing");
    EXPECT_EQ(delivery.sinkStates()[0].lag, static_cast<std::uint64_t>(more));
    delivery.finish(Clock::now() + 50ms);
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "zrmagent: " + std::to_string(more) +
                  " events were not delivered to /dev/full; it will get them when the agent runs "
                  "again\n");
}

TEST_F(DeliveryTest, ASinkThatHangsAtTheStopLeavesTheOthersTheirTime) {
    const std::string later = directory.file("later/events.jsonl");
    const HostConfig used = configFor({"/dev/full", later});
    Delivery delivery(used, testLayout(), sizeof(TestRow), openHistory(used));
    delivery.start();
    push(delivery, "a");
    // Both fail, and their pauses have grown.
    const auto limit = Clock::now() + 20s;
    while (delivery.sinkStates()[1].retryIn.value_or(0ms) < 2s && Clock::now() < limit) {
        std::this_thread::sleep_for(1ms);
    }
    std::filesystem::create_directory(directory.file("later"));
    testing::internal::CaptureStderr();
    delivery.finish(Clock::now() + 1s);
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "zrmagent: 1 events were not delivered to /dev/full; it will get them when the agent "
              "runs again\n");
    EXPECT_EQ(lines(later), 1);
}

TEST_F(DeliveryTest, WithoutADirectoryItRunsWithoutAHistory) {
    const std::string output = directory.file("events.jsonl");
    HostConfig config = configFor({output});
    config.history.directory = directory.file("no/such");
    testing::internal::CaptureStderr();
    Delivery delivery(config, testLayout(), sizeof(TestRow), openHistory(config));
    const std::string problem = "cannot create the directory " + config.history.directory +
                                ": No such file or directory; make it a directory that the agent "
                                "may write, or set history.directory to one";
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "zrmagent: the history is off: " + problem +
                  ". Until the next start sinks receive events without it, and one that stays down "
                  "stops the monitoring\n");
    EXPECT_EQ(delivery.historyProblem(), problem);
    EXPECT_EQ(delivery.history(), nullptr);
    delivery.start();
    push(delivery, "a");
    delivery.finish(Clock::now() + 10s);
    EXPECT_EQ(lines(output), 1);
}

} // namespace
