#include "host/history/EventBatch.h"

#include "TestBatch.h"
#include "unit/host/events/TestEvents.h"

#include <gtest/gtest.h>

#include <string>

using namespace zrm::host;

namespace {

TEST(EventBatch, RendersEventsOfTheQueue) {
    TestEvents events;
    events.add("first");
    events.add("second");
    EventBatch batch;
    for (const Event& event : events.all()) {
        batch.add(event, EventJson(testLayout()));
    }
    batch.seal();
    ASSERT_EQ(batch.size(), 2u);
    EXPECT_EQ(batch.first(), 1u);
    EXPECT_EQ(batch.last(), 2u);
    const EventRecord& second = batch.records()[1];
    EXPECT_EQ(second.id, 2u);
    EXPECT_EQ(second.raised, testTime);
    EXPECT_EQ(second.situation, "watch");
    EXPECT_EQ(second.severity, "minor");
    EXPECT_EQ(second.text, "");
    EXPECT_EQ(second.log, "/var/log/app.log");
    EXPECT_EQ(std::string(second.json) + "\n", TestEvents::line(2, "second"));
}

TEST(EventBatch, KeepsCopiesOfEvents) {
    EventBatch batch;
    {
        const std::string situation = "gone soon";
        for (std::uint64_t id = 7; id < 500; ++id) { // the memory moves as it grows
            const std::string json = "{" + std::to_string(id) + "}";
            batch.add(EventRecord{id, 1, situation, id % 2 == 0 ? "info" : "major", "/log", json,
                                  id % 3 == 0 ? "third" : ""});
        }
    }
    batch.seal();
    EXPECT_EQ(batch.first(), 7u);
    for (const EventRecord& event : batch.records()) {
        EXPECT_EQ(event.situation, "gone soon");
        EXPECT_EQ(event.severity, event.id % 2 == 0 ? "info" : "major");
        EXPECT_EQ(event.log, "/log");
        EXPECT_EQ(event.text, event.id % 3 == 0 ? "third" : "");
        EXPECT_EQ(event.json, "{" + std::to_string(event.id) + "}");
    }
}

TEST(EventBatch, ASharedTextIsStoredOnce) {
    EventBatch batch;
    const std::string log(1000, 'x');
    for (std::uint64_t id = 1; id <= 100; ++id) {
        batch.add(testEvent(id, testTime, "watch", log));
    }
    batch.seal();
    EXPECT_LT(batch.textBytes(), 2000u);
    EXPECT_EQ(batch.records()[99].log, log);
}

} // namespace
