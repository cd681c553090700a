#include "host/api/EventsResource.h"

#include "support/RecordingTrace.h"
#include "unit/host/api/TestHistory.h"
#include "unit/host/http/TestRouter.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

using namespace zrm::host;

namespace {

using testing::ElementsAre;

class EventsResourceTest : public testing::Test {
protected:
    std::string get(const std::string& url) const {
        const HttpAnswer answer = router.ask("GET", url);
        return std::to_string(answer.status) + " " + answer.body;
    }

    RecordingTrace trace{0};
    TestHistory history;
    EventsResource resource{&history};
    TestRouter router{resource};
};

TEST_F(EventsResourceTest, ReturnsTheNewestFirstAndWhereToContinue) {
    EXPECT_EQ(get("/api/v1/events"),
              R"(200 {"events":[],"next":null,"oldest":0,"newest":0,"damaged":[]})");
    for (std::uint64_t id = 5; id <= 9; ++id) {
        history.add(id);
    }
    EXPECT_EQ(get("/api/v1/events?limit=2"),
              R"(200 {"events":[{"id":9},{"id":8}],"next":8,"oldest":5,"newest":9,"damaged":[]})");
    EXPECT_EQ(
        get("/api/v1/events?limit=3&before=8"),
        R"(200 {"events":[{"id":7},{"id":6},{"id":5}],"next":null,"oldest":5,"newest":9,"damaged":[]})");
    EXPECT_EQ(get("/api/v1/events?limit=2&after=5&order=asc"),
              R"(200 {"events":[{"id":6},{"id":7}],"next":7,"oldest":5,"newest":9,"damaged":[]})");
}

TEST_F(EventsResourceTest, ASearchThatStoppedSaysWhereToContinue) {
    history.add(7);
    history.reached = 5;
    history.damaged = {6, 5};
    EXPECT_EQ(get("/api/v1/events?text=x"),
              R"(200 {"events":[{"id":7}],"next":5,"oldest":7,"newest":7,"damaged":[6,5]})");
    history.add(8);
    EXPECT_EQ(get("/api/v1/events?text=x&limit=1"),
              R"(200 {"events":[{"id":8}],"next":8,"oldest":7,"newest":8,"damaged":[6,5]})")
        << "a full page continues after its last event";
    EXPECT_EQ(get("/api/v1/events?text=" + std::string(257, 'x')),
              "400 text: write at most 256 bytes");
}

TEST_F(EventsResourceTest, PassesEveryParameterToTheHistory) {
    get("/api/v1/events?after=3&before=9&from=1970-01-01T00:00:01Z&to=1970-01-01T00:00:02.5Z&"
        "situation=a&situation=b%27%3B--&log=%2Fx&severity=info&severity=critical&text=%22+y&"
        "limit=1000");
    const EventFilter filter = history.lastFilter();
    EXPECT_EQ(filter.after, 3u);
    EXPECT_EQ(filter.before, 9u);
    EXPECT_EQ(filter.from, 1000);
    EXPECT_EQ(filter.to, 2500);
    EXPECT_THAT(filter.situations, ElementsAre("a", "b';--"));
    EXPECT_THAT(filter.logs, ElementsAre("/x"));
    EXPECT_THAT(filter.severities, ElementsAre("info", "critical"));
    EXPECT_EQ(filter.text, "\" y");
    EXPECT_EQ(filter.limit, 1001u);
    EXPECT_TRUE(filter.newestFirst);
}

TEST_F(EventsResourceTest, RefusesInvalidParameters) {
    EXPECT_EQ(get("/api/v1/events?limit=0"), "400 limit: write a whole number from 1 to 1000");
    EXPECT_EQ(get("/api/v1/events?limit=1001"), "400 limit: write a whole number from 1 to 1000");
    EXPECT_EQ(get("/api/v1/events?after=-1"),
              "400 after: write a whole number from 0 to 9223372036854775807");
    EXPECT_EQ(get("/api/v1/events?order=up"), "400 order: write asc or desc");
    EXPECT_EQ(
        get("/api/v1/events?severity=red"),
        "400 severity: 'red' is not a severity; the severities are info, minor, warning, major, "
        "critical");
    EXPECT_EQ(get("/api/v1/events?colour=red").substr(0, 30), "400 colour: unknown parameter;");
    std::string many = "/api/v1/events?log=1";
    for (int count = 0; count < 100; ++count) {
        many += "&log=1";
    }
    EXPECT_EQ(get(many), "400 log: the parameter appears more than 100 times");
}

TEST_F(EventsResourceTest, ReturnsOneEvent) {
    history.add(7);
    EXPECT_EQ(get("/api/v1/events/7"), R"(200 {"id":7})");
    EXPECT_EQ(get("/api/v1/events/8"), "404 id: the history does not contain this event");
    for (const char* const id : {"x", "-1", "7x", "9223372036854775808", "1%20OR%201=1"}) {
        EXPECT_EQ(get("/api/v1/events/" + std::string(id)),
                  "404 id: an event's id is a whole number");
    }
}

TEST_F(EventsResourceTest, ReturnsRates) {
    EXPECT_EQ(get("/api/v1/rates?from=1970-01-01T00:00:00Z&to=1970-01-01T00:04:00Z&step=120"),
              R"(200 {"start":"1970-01-01T00:00:00.000Z","step":120,"logs":[)"
              R"({"log":"/a","entries":[1,null],"events":[0,null]},)"
              R"({"log":"/b","entries":[],"events":[]}]})");
    EXPECT_EQ(
        get("/api/v1/rates?from=1970-01-01T00:00:00Z&to=1970-01-01T00:04:00Z&step=120&log=/b"),
        R"(200 {"start":"1970-01-01T00:00:00.000Z","step":120,"logs":[)"
        R"({"log":"/b","entries":[],"events":[]}]})");
    get("/api/v1/rates");
    EXPECT_EQ(history.ratesTo - history.ratesFrom, 24 * 3600 * 1000);
    EXPECT_EQ(get("/api/v1/rates?step=90"), "400 step: write a multiple of 60 seconds");
    EXPECT_EQ(get("/api/v1/rates?step=59"), "400 step: write a whole number from 60 to 86400");
    EXPECT_EQ(get("/api/v1/rates?from=2026-01-02&to=2026-01-01"), "400 to: is before from");
    EXPECT_EQ(get("/api/v1/rates?from=2026-01-01&to=2026-01-04"),
              "400 step: the window has more than 2880 steps");
}

TEST_F(EventsResourceTest, ReportsWhyTheHistoryCannotBeRead) {
    history.fail();
    for (const char* const url : {"/api/v1/events", "/api/v1/events/1", "/api/v1/rates"}) {
        EXPECT_EQ(get(url), "503 : the history cannot be read: disk I/O error") << url;
    }
}

TEST(EventsResourceOff, IsReported) {
    const RecordingTrace trace(0);
    EventsResource resource(nullptr);
    const TestRouter router(resource);
    for (const char* const url : {"/api/v1/events", "/api/v1/events/1", "/api/v1/rates"}) {
        const HttpAnswer answer = router.ask("GET", url);
        EXPECT_EQ(answer.status, 409);
        EXPECT_EQ(answer.body, ": the history is off");
    }
}

} // namespace
