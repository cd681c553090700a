#include "host/events/Episode.h"
#include "host/events/EventJson.h"
#include "host/events/EventQueue.h"

#include "TestEvents.h"

#include <gtest/gtest.h>

#include <memory>
#include <string>

using namespace zrm::host;

namespace {

const auto label = std::make_shared<const SituationLabel>(SituationLabel{"watch", "minor"});

EventJudgement judgementOf(EventJudgement::State state, std::uint64_t episode = 0) {
    EventJudgement judgement;
    judgement.state = state;
    judgement.episode = std::make_shared<EpisodeId>(episode);
    judgement.count = 74;
    judgement.first = 1'795'158'000;
    judgement.last = 1'795'158'060;
    judgement.group = {{"ip", "10.0.0.1"}, {"user", "\"x\""}};
    return judgement;
}

std::string jsonOf(const Event& event) {
    std::string text;
    EventJson(testLayout()).append(text, event);
    return text;
}

TEST(JudgedEvent, TheJsonHasTheEpisodeAndTheGroup) {
    TestEvents events;
    events.add("text");
    Event event = events.all().front();
    event.judgement =
        std::make_shared<const EventJudgement>(judgementOf(EventJudgement::RAISED, event.id));
    EXPECT_EQ(jsonOf(event),
              R"({"id":1,"situation":"watch","severity":"minor",)"
              R"("raised":"2026-11-20T07:03:09.412Z","state":"raised","episode":{"id":1,)"
              R"("raised":"2026-11-20T07:03:09.412Z","count":74,)"
              R"("first":"2026-11-20T07:00:00.000Z","last":"2026-11-20T07:01:00.000Z"},)"
              R"("group":{"ip":"10.0.0.1","user":"\"x\""},"row":{"LOGPATH":"/var/log/",)"
              R"("LOGNAME":"app.log","TEXT":"text","NUMBER":7}})");
}

TEST(JudgedEvent, OneOfASituationWithoutEpisodesHasItsCount) {
    TestEvents events;
    events.add("text");
    Event event = events.all().front();
    EventJudgement judgement;
    judgement.count = 5;
    event.judgement = std::make_shared<const EventJudgement>(judgement);
    EXPECT_NE(jsonOf(event).find(R"(.412Z","count":5,"row":{)"), std::string::npos)
        << jsonOf(event);
}

TEST(JudgedEvent, OneWithoutARowHasTheLogAndTheNode) {
    EventJudgement judgement = judgementOf(EventJudgement::RESOLVED, 17);
    judgement.group.clear();
    judgement.reason = "the situation was removed";
    judgement.log = "/var/log/app.log";
    judgement.node = "web1:ZRM";
    judgement.episode->set(17, 1'795'158'000'000);
    Event event;
    event.id = 18;
    event.raised = 1'795'158'189'412;
    event.situation = label;
    event.judgement = std::make_shared<const EventJudgement>(judgement);
    EXPECT_EQ(jsonOf(event),
              R"({"id":18,"situation":"watch","severity":"minor",)"
              R"("raised":"2026-11-20T07:03:09.412Z","state":"resolved","episode":{"id":17,)"
              R"("raised":"2026-11-20T07:00:00.000Z","count":74,)"
              R"("first":"2026-11-20T07:00:00.000Z","last":"2026-11-20T07:01:00.000Z"},)"
              R"("reason":"the situation was removed","log":"/var/log/app.log",)"
              R"("node":"web1:ZRM"})");
    std::string log;
    EventJson(testLayout()).appendLog(log, event);
    EXPECT_EQ(log, "/var/log/app.log");
}

class JudgedEventQueueTest : public testing::Test {
protected:
    static std::shared_ptr<EventJudgement> raised() {
        return std::make_shared<EventJudgement>(judgementOf(EventJudgement::RAISED));
    }

    EventQueue queue{2, 16, 100};
    const EventQueue::Reader reader = queue.addReader();
};

TEST_F(JudgedEventQueueTest, ARaisedEventGivesItsEpisodeItsId) {
    const auto first = raised();
    const auto second = raised();
    EXPECT_TRUE(queue.push(label, "0123456789abcdef", first));
    EXPECT_TRUE(queue.push(label, "0123456789abcdef"));
    EXPECT_TRUE(queue.push(label, "0123456789abcdef", second)) << "kept aside";
    EXPECT_EQ(first->episode->value(), 101u);
    EXPECT_EQ(second->episode->value(), 103u);
}

TEST_F(JudgedEventQueueTest, AResolvedEventKeepsTheIdOfItsEpisode) {
    const auto judgement =
        std::make_shared<const EventJudgement>(judgementOf(EventJudgement::RESOLVED, 7));
    EXPECT_TRUE(queue.push(label, nullptr, judgement));
    EXPECT_EQ(judgement->episode->value(), 7u);
}

TEST_F(JudgedEventQueueTest, SlotsAreUsedAgainWithAndWithoutARow) {
    const auto judgement =
        std::make_shared<const EventJudgement>(judgementOf(EventJudgement::RESOLVED, 7));
    for (int round = 0; round < 3; ++round) {
        EXPECT_TRUE(queue.push(label, nullptr, judgement));
        EXPECT_TRUE(queue.push(label, "0123456789abcdef"));
        EXPECT_TRUE(queue.push(label, nullptr, judgement)) << "kept aside";
        for (const bool hasRow : {false, true, false}) {
            const auto events = queue.read(reader, 1);
            ASSERT_EQ(events.size(), 1u);
            EXPECT_EQ(events[0].row != nullptr, hasRow);
            EXPECT_EQ(events[0].judgement != nullptr, !hasRow);
            queue.release(reader, 1);
        }
    }
}

TEST_F(JudgedEventQueueTest, AnEntryCollectsEventsWithAndWithoutARow) {
    EntryEvents events;
    const auto judgement =
        std::make_shared<const EventJudgement>(judgementOf(EventJudgement::RESOLVED, 7));
    events.add(label, "0123456789abcdef", 16);
    events.add(label, nullptr, 16, judgement);
    events.add(label, "fedcba9876543210", 16, raised());
    ASSERT_EQ(events.size(), 3u);
    EXPECT_EQ(std::string(events.row(0), 16), "0123456789abcdef");
    EXPECT_EQ(events.row(1), nullptr);
    EXPECT_EQ(events.judgement(1), judgement);
    EXPECT_EQ(std::string(events.row(2), 16), "fedcba9876543210");
    EXPECT_EQ(queue.pushEntry(events, nullptr, {}), 103u);
    EXPECT_EQ(events.judgement(2)->episode->value(), 103u);
}

} // namespace
