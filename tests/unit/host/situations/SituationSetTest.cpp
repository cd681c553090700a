#include "host/situations/SituationSet.h"

#include "framework/ctreq.h"
#include "logs/zrm_rmlogent_data.h"
#include "support/RecordingTrace.h"
#include "tables/zrm_rmlogent_manager.h"
#include "unit/host/framework/TestTable.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <cstring>
#include <ctime>
#include <future>
#include <string>
#include <thread>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using Clock = EventQueue::Clock;
using testing::ElementsAre;

SituationConfig situation(const std::string& name, std::vector<Condition> conditions) {
    return {name, "", "minor", std::move(conditions)};
}

/// At least two entries of a source within an hour.
SituationConfig twoOf(const char* source) {
    return situation("two", {textCondition("ENTRYSRC", INTF_EQUAL, source),
                             numberCondition("FREQTHRESH", INTF_GREATER_OR_EQUAL, 2),
                             numberCondition("PERIODTHRS", INTF_EQUAL, 3600)});
}

/// The time in the form of rows.
std::string now() {
    const std::time_t time = std::time(nullptr);
    std::tm local{};
    localtime_r(&time, &local);
    char stamp[32];
    std::strftime(stamp, sizeof stamp, "1%y%m%d%H%M%S000", &local);
    return stamp;
}

class SituationSetTest : public testing::Test {
protected:
    unsigned arrive(const std::string& source) {
        zrm_rmlogent_data_t row;
        std::memset(&row, ' ', sizeof row);
        std::memcpy(row.entrytime, now().data(), sizeof row.entrytime);
        source.copy(row.entrysrc, sizeof row.entrysrc);
        return entries.AddDataToEvent(&row, 1);
    }
    /// The situations whose events are in the queue, which is emptied.
    std::vector<std::string> raised() {
        std::vector<std::string> names;
        while (queue.backlog(reader) > 0) {
            names.push_back(queue.read(reader, 1)[0].situation->name);
            queue.release(reader, 1);
        }
        return names;
    }

    RecordingTrace trace{TRC1_ERROR};
    zrm_rmlogent_manager entries{"ZRM", "RMLOGENT"};
    EventQueue queue{4, sizeof(zrm_rmlogent_data_t)};
    EventQueue::Reader reader = queue.addReader();
    SituationSet situations{entries, queue};
};

TEST_F(SituationSetTest, RowsThatMeetTheConditionsBecomeEvents) {
    situations.apply({situation("ssh", {textCondition("ENTRYSRC", INTF_EQUAL, "sshd")}),
                      situation("every", {})});
    EXPECT_EQ(situations.size(), 2u);
    EXPECT_EQ(arrive("cron"), 0u);
    EXPECT_THAT(raised(), ElementsAre("every"));
    EXPECT_EQ(arrive("sshd"), 0u);
    EXPECT_THAT(raised(), testing::UnorderedElementsAre("ssh", "every"));
}

TEST_F(SituationSetTest, AnEventCarriesTheRowAndTheSituation) {
    situations.apply({situation("every", {})});
    arrive("sshd");
    const Event& event = queue.read(reader, 1)[0];
    EXPECT_EQ(event.situation->name, "every");
    EXPECT_EQ(event.situation->severity, "minor");
    zrm_rmlogent_data_t row;
    std::memcpy(&row, event.row, sizeof row);
    EXPECT_EQ(std::string(row.entrysrc, 5), "sshd ");
}

TEST_F(SituationSetTest, ThresholdsAreInForce) {
    situations.apply({twoOf("sshd")});
    arrive("sshd");
    EXPECT_THAT(raised(), ElementsAre());
    arrive("sshd");
    EXPECT_THAT(raised(), ElementsAre("two"));
}

TEST_F(SituationSetTest, ARemovedSituationRaisesNothingMore) {
    situations.apply({situation("a", {}), situation("b", {})});
    situations.apply({situation("b", {})});
    EXPECT_EQ(situations.size(), 1u);
    arrive("sshd");
    EXPECT_THAT(raised(), ElementsAre("b"));
    situations.close();
    arrive("sshd");
    EXPECT_THAT(raised(), ElementsAre());
}

TEST_F(SituationSetTest, AnUnchangedSituationKeepsItsCounts) {
    situations.apply({twoOf("sshd")});
    arrive("sshd");
    situations.apply(
        {situation("another", {textCondition("ENTRYSRC", INTF_EQUAL, "cron")}), twoOf("sshd")});
    arrive("sshd");
    EXPECT_THAT(raised(), ElementsAre("two"));
}

TEST_F(SituationSetTest, AChangedSituationStartsOver) {
    situations.apply({twoOf("sshd")});
    arrive("sshd");
    arrive("cron");
    situations.apply({twoOf("cron")});
    arrive("cron");
    EXPECT_THAT(raised(), ElementsAre());
    arrive("cron");
    EXPECT_THAT(raised(), ElementsAre("two"));
    SituationConfig severe = twoOf("cron");
    severe.severity = "critical";
    situations.apply({severe});
    arrive("cron");
    EXPECT_THAT(raised(), ElementsAre()) << "a situation with another severity is a new one";
}

TEST_F(SituationSetTest, AFullQueueTakesTheEventsOfARowAndAClosedOneDoesNot) {
    situations.apply({situation("a", {}), situation("b", {})});
    for (int count = 0; count < 3; ++count) { // the queue holds four
        EXPECT_EQ(arrive("sshd"), 0u);
    }
    EXPECT_EQ(queue.backlog(reader), 6u);
    queue.close();
    EXPECT_NE(arrive("sshd"), 0u) << "the log is told that its row was refused";
    EXPECT_EQ(raised().size(), 6u);
}

TEST_F(SituationSetTest, SituationsComeAndGoWhileRowsArrive) {
    std::atomic<bool> isOver{false};
    std::thread log([&] {
        while (!isOver) {
            arrive("sshd");
        }
    });
    std::thread sink([&] {
        for (auto events = queue.read(reader, 4); !events.empty(); events = queue.read(reader, 4)) {
            EXPECT_TRUE(events[0].situation->name == "a" || events[0].situation->name == "b");
            queue.release(reader, events.size());
        }
    });
    for (int round = 0; round < 200; ++round) {
        situations.apply({situation(round % 2 == 0 ? "a" : "b", {})});
    }
    situations.close();
    isOver = true;
    log.join();
    queue.close();
    sink.join();
}

TEST(SituationSet, ReportsThatASituationCouldNotBeOpened) {
    const RecordingTrace trace(TRC1_ERROR);
    TestManager table;
    table.gives = false;
    EventQueue queue(1, sizeof(TestRow));
    SituationSet situations(table, queue);
    situations.apply({situation("a", {})});
    EXPECT_THAT(trace.messages(), ElementsAre("Situation a could not be opened."));
}

TEST(SituationSet, ReportsThatTheAgentStoppedASituation) {
    const RecordingTrace trace(TRC1_ERROR);
    TestManager table;
    table.onCreate = [](TestRequest& request) { request.Stopped(1); };
    EventQueue queue(1, sizeof(TestRow));
    SituationSet situations(table, queue);
    situations.apply({situation("a", {})});
    EXPECT_THAT(trace.messages(), ElementsAre("The agent has stopped situation a; reason = 1."));
}

} // namespace
