#include "host/events/Delivery.h"

#include "TestEvents.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"

#include <gtest/gtest.h>

#include <chrono>
#include <fstream>
#include <iterator>
#include <string>

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

    RecordingTrace trace{0};
    TemporaryDirectory directory;
    std::shared_ptr<const SituationLabel> label =
        std::make_shared<const SituationLabel>(SituationLabel{"watch", "minor"});
};

TEST_F(DeliveryTest, EverySinkGetsEveryEvent) {
    const std::string first = directory.file("a.jsonl");
    const std::string second = directory.file("b.jsonl");
    Delivery delivery({SinkConfig::jsonl(first), SinkConfig::jsonl(second)}, testLayout(),
                      sizeof(TestRow));
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

TEST_F(DeliveryTest, SaysWhatWasNotDelivered) {
    const std::string good = directory.file("good.jsonl");
    Delivery delivery({SinkConfig::jsonl("/dev/full"), SinkConfig::jsonl(good)}, testLayout(),
                      sizeof(TestRow));
    delivery.start();
    push(delivery, "a");
    push(delivery, "b");
    testing::internal::CaptureStderr();
    delivery.finish(Clock::now() + 50ms);
    EXPECT_EQ(testing::internal::GetCapturedStderr(),
              "zrmagent: 2 events were not delivered to /dev/full\n");
    EXPECT_EQ(lines(good), 2);
}

} // namespace
