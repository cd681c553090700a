#include "host/api/EpisodesResource.h"

#include "support/RecordingTrace.h"
#include "unit/host/api/TestHistory.h"
#include "unit/host/http/TestRouter.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

using namespace zrm::host;

namespace {

using testing::ElementsAre;

class EpisodesResourceTest : public testing::Test {
protected:
    std::string get(const std::string& url) const {
        const HttpAnswer answer = router.ask("GET", url);
        return std::to_string(answer.status) + " " + answer.body;
    }
    static EpisodeRecord episode(std::uint64_t id) {
        EpisodeRecord record;
        record.id = id;
        record.situation = "ssh";
        record.severity = "major";
        record.log = "/log";
        record.groups = R"({"ip":"10.0.0.1"})";
        record.raised = 1000;
        record.count = 74;
        record.first = 0;
        record.last = 60;
        record.shares = {{nullptr, "/log", 74, 0, 60}};
        return record;
    }
    static std::string json(std::uint64_t id) {
        return R"({"id":)" + std::to_string(id) +
               R"(,"state":"open","situation":"ssh","severity":"major","log":"/log",)"
               R"("group":{"ip":"10.0.0.1"},"raised":"1970-01-01T00:00:01.000Z","count":74,)"
               R"("first":"1970-01-01T00:00:00.000Z","last":"1970-01-01T00:01:00.000Z",)"
               R"("resolved":null,"reason":null,"logs":[{"log":"/log","count":74,)"
               R"("first":"1970-01-01T00:00:00.000Z","last":"1970-01-01T00:01:00.000Z"}])";
    }

    RecordingTrace trace{0};
    TestHistory history;
    EpisodesResource resource{&history};
    TestRouter router{resource};
};

TEST_F(EpisodesResourceTest, ReturnsAPageAndWhereToContinue) {
    EXPECT_EQ(get("/api/v1/episodes"), R"(200 {"episodes":[],"next":null})");
    history.storedEpisodes = {episode(9), episode(7)};
    EXPECT_EQ(get("/api/v1/episodes?limit=1"), "200 {\"episodes\":[" + json(9) + "}],\"next\":9}");
    EXPECT_EQ(get("/api/v1/episodes?limit=2"),
              "200 {\"episodes\":[" + json(9) + "}," + json(7) + "}],\"next\":null}");
}

TEST_F(EpisodesResourceTest, PassesEveryParameterToTheHistory) {
    get("/api/v1/episodes?before=9&state=resolved&situation=a&situation=b&log=%2Fx&"
        "group=ip%3D10.0.0.1&group=user%3Da%3Db&limit=1000");
    const EpisodeFilter& filter = history.episodeFilter;
    EXPECT_EQ(filter.before, 9u);
    EXPECT_EQ(filter.isOpen, false);
    EXPECT_THAT(filter.situations, ElementsAre("a", "b"));
    EXPECT_THAT(filter.logs, ElementsAre("/x"));
    EXPECT_THAT(filter.group, ElementsAre(GroupValue{"ip", "10.0.0.1"}, GroupValue{"user", "a=b"}));
    EXPECT_EQ(filter.limit, 1001u);
    EXPECT_TRUE(get("/api/v1/episodes?state=over").starts_with("400 state: "));
    EXPECT_TRUE(get("/api/v1/episodes?group=ip").starts_with("400 group: "));
    EXPECT_TRUE(get("/api/v1/episodes?limit=0").starts_with("400 limit: "));
    EXPECT_TRUE(get("/api/v1/episodes?other=1").starts_with("400 "));
}

TEST_F(EpisodesResourceTest, OneComesWithItsEvents) {
    EpisodeRecord record = episode(7);
    record.isOpen = false;
    record.resolved = 2000;
    record.resolvedBy = 12;
    record.reason = "the situation was changed";
    history.storedEpisodes = {record};
    history.add(7);
    history.add(12);
    const std::string answer = get("/api/v1/episodes/7");
    EXPECT_EQ(history.episodeFilter.id, 7u);
    EXPECT_NE(answer.find(R"("resolved":"1970-01-01T00:00:02.000Z")"), std::string::npos);
    EXPECT_NE(answer.find(R"("reason":"the situation was changed")"), std::string::npos);
    EXPECT_TRUE(answer.ends_with(R"(,"events":[{"id":7},{"id":12}]})")) << answer;
    history.storedEpisodes.clear();
    EXPECT_TRUE(get("/api/v1/episodes/8").starts_with("404 "));
    EXPECT_TRUE(get("/api/v1/episodes/x").starts_with("404 "));
}

TEST_F(EpisodesResourceTest, AHistoryThatCannotBeReadOrIsOffIsReported) {
    history.fail();
    EXPECT_TRUE(get("/api/v1/episodes").starts_with("503 "));
    EpisodesResource off(nullptr);
    const TestRouter router(off);
    EXPECT_EQ(router.ask("GET", "/api/v1/episodes").status, 409);
}

} // namespace
