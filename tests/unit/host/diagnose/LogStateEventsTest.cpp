#include "host/diagnose/LogStateEvents.h"

#include "host/events/Episode.h"
#include "host/events/PositionBook.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <memory>
#include <optional>
#include <string>
#include <vector>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using testing::ElementsAre;
using testing::IsEmpty;

constexpr std::int64_t noon = 1'800'000'000;

/// With times of its own.
class LogStateEventsTest : public testing::Test {
protected:
    LogStateEventsTest() { PositionBook::makeCurrent(book); }
    ~LogStateEventsTest() override { PositionBook::makeCurrent(PositionBook::unkept()); }

    void judge(std::optional<bool> quiet, std::chrono::seconds later = 5s) {
        now += later;
        events.judge({{"/log", LogState::Kind::QUIET, quiet, 600s, "It is quiet."}}, now,
                     (noon + now.time_since_epoch() / 1s) * 1000);
    }
    /// What has been raised and resolved since the last call.
    std::vector<std::string> taken() {
        std::vector<std::string> texts;
        const auto read = queue.read(reader, 100, EventQueue::Clock::now());
        for (const Event& event : read) {
            const EventJudgement& judgement = *event.judgement;
            const bool isRaised = judgement.state == EventJudgement::RAISED;
            texts.push_back(event.situation->name + ' ' + judgement.log + ' ' +
                            std::to_string(judgement.episode->value()) + ' ' +
                            (isRaised ? judgement.text : judgement.reason));
            first = judgement.first;
            EXPECT_EQ(event.row, nullptr);
            EXPECT_EQ(event.situation->severity, "warning");
        }
        queue.release(reader, read.size());
        return texts;
    }

    std::shared_ptr<PositionBook> book = PositionBook::unkept();
    EventQueue queue{16, 8};
    const EventQueue::Reader reader = queue.addReader();
    LogStates::Clock::time_point now{100s};
    LogStateEvents events{queue, now};
    std::int64_t first = 0;
};

TEST_F(LogStateEventsTest, AStateIsRaisedOnceAndResolvedOnce) {
    judge(false);
    EXPECT_THAT(taken(), IsEmpty());
    judge(true);
    EXPECT_THAT(taken(), ElementsAre("log-quiet /log 1 It is quiet."));
    EXPECT_EQ(first, noon + 110 - 600);
    judge(true);
    judge(std::nullopt);
    EXPECT_THAT(taken(), IsEmpty());
    judge(false);
    EXPECT_THAT(taken(), ElementsAre("log-quiet /log 1 an entry has come"));
    EXPECT_EQ(first, noon + 110 - 600);
    judge(false);
    EXPECT_THAT(taken(), IsEmpty());
    judge(true);
    EXPECT_THAT(taken(), ElementsAre("log-quiet /log 3 It is quiet."));
}

TEST_F(LogStateEventsTest, AStateOfALogThatIsNotWatchedAnyMoreIsOver) {
    judge(true);
    taken();
    events.judge({}, now + 29s, noon * 1000);
    EXPECT_THAT(taken(), IsEmpty()) << "a refresh takes a while";
    judge(std::nullopt, 29s);
    events.judge({}, now + 30s, noon * 1000);
    EXPECT_THAT(taken(), ElementsAre("log-quiet /log 1 the log is no longer watched for it"));
}

TEST_F(LogStateEventsTest, AnEpisodeOfAnEarlierRunGoesOn) {
    StoredEpisode stored;
    stored.id = 7;
    stored.situation = "log-dead";
    stored.log = "/log";
    stored.first = noon - 50;
    book->setEpisodes({stored});
    LogStateEvents next(queue, now);
    next.judge({{"/log", LogState::Kind::DEAD, std::nullopt}}, now + 5s, noon * 1000);
    EXPECT_THAT(taken(), IsEmpty());
    next.judge({{"/log", LogState::Kind::DEAD, true, 30s, "dead"}}, now + 30s, noon * 1000);
    EXPECT_THAT(taken(), IsEmpty()) << "it is raised already";
    next.judge({{"/log", LogState::Kind::DEAD, false}}, now + 35s, noon * 1000);
    EXPECT_THAT(taken(), ElementsAre("log-dead /log 7 there is a file that can be read"));
    EXPECT_EQ(first, noon - 50);
    EXPECT_THAT(book->takeEpisodes(std::nullopt), IsEmpty());
}

} // namespace
