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
               R"("resolved":null,"reason":null,"acknowledged":null,"logs":[{"log":"/log","count":74,)"
               R"("first":"1970-01-01T00:00:00.000Z","last":"1970-01-01T00:01:00.000Z"}])";
    }

    RecordingTrace trace{0};
    /// Answers every request in the same way, and remembers the last.
    struct TestAcknowledgements : Acknowledgements {
        Result<AcknowledgementChange> acknowledge(std::uint64_t episode,
                                                  const Acknowledgement& by) override {
            last = episode;
            taken = by;
            return result;
        }
        Result<AcknowledgementChange> withdraw(std::uint64_t episode) override {
            last = episode;
            return result;
        }
        std::uint64_t last = 0;
        Acknowledgement taken;
        Result<AcknowledgementChange> result = AcknowledgementChange::DONE;
    };
    std::string send(const char* method, const std::string& url, const std::string& body) const {
        const HttpAnswer answer = router.ask(method, url, body);
        return std::to_string(answer.status) + " " + answer.body;
    }

    TestHistory history;
    TestAcknowledgements acknowledgements;
    EpisodesResource resource{&history, &acknowledgements};
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
        "acknowledged=true&id=7&id=8&"
        "group=ip%3D10.0.0.1&group=user%3Da%3Db&limit=1000");
    const EpisodeFilter& filter = history.episodeFilter;
    EXPECT_EQ(filter.before, 9u);
    EXPECT_EQ(filter.isOpen, false);
    EXPECT_EQ(filter.isAcknowledged, true);
    EXPECT_THAT(filter.ids, ElementsAre(7, 8));
    EXPECT_THAT(filter.situations, ElementsAre("a", "b"));
    EXPECT_THAT(filter.logs, ElementsAre("/x"));
    EXPECT_THAT(filter.group, ElementsAre(GroupValue{"ip", "10.0.0.1"}, GroupValue{"user", "a=b"}));
    EXPECT_EQ(filter.limit, 1001u);
    EXPECT_TRUE(get("/api/v1/episodes?state=over").starts_with("400 state: "));
    EXPECT_TRUE(get("/api/v1/episodes?acknowledged=1").starts_with("400 acknowledged: "));
    EXPECT_TRUE(get("/api/v1/episodes?id=x").starts_with("400 id: "));
    std::string many = "/api/v1/episodes?id=1";
    for (int more = 0; more < 100; ++more) {
        many += "&id=1";
    }
    EXPECT_TRUE(get(many).starts_with("400 id: "));
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
    EXPECT_THAT(history.episodeFilter.ids, ElementsAre(7));
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
    EpisodesResource off(nullptr, nullptr);
    const TestRouter router(off);
    EXPECT_EQ(router.ask("GET", "/api/v1/episodes").status, 409);
    EXPECT_EQ(router.ask("POST", "/api/v1/episodes/7/ack", R"({"who":"ann"})").status, 409);
}

TEST_F(EpisodesResourceTest, OneIsAcknowledgedWithANameAndANote) {
    history.storedEpisodes = {episode(7)};
    history.storedEpisodes[0].acknowledged = {1000, "ann", "<b>\xc3\xa4"};
    const std::string answer =
        send("POST", "/api/v1/episodes/7/ack", R"({"who":"ann","note":"on it"})");
    EXPECT_NE(answer.find(R"("acknowledged":{"time":"1970-01-01T00:00:01.000Z","who":"ann",)"
                          R"("note":"<b>)"),
              std::string::npos)
        << answer;
    EXPECT_EQ(acknowledgements.last, 7u);
    EXPECT_EQ(acknowledgements.taken.who, "ann");
    EXPECT_EQ(acknowledgements.taken.note, "on it");
    EXPECT_GT(acknowledgements.taken.time, 0);
    EXPECT_TRUE(send("DELETE", "/api/v1/episodes/7/ack", "").starts_with("200 "));
}

TEST_F(EpisodesResourceTest, WhatCannotBeAcknowledgedIsRefusedWithTheReason) {
    const std::string url = "/api/v1/episodes/7/ack";
    const std::string body = R"({"who":"ben"})";
    EXPECT_TRUE(send("POST", "/api/v1/episodes/x/ack", body).starts_with("404 id: "));
    acknowledgements.result = AcknowledgementChange::UNKNOWN;
    EXPECT_TRUE(send("POST", url, body).starts_with("404 id: "));
    history.storedEpisodes = {episode(7)};
    history.storedEpisodes[0].acknowledged = {1000, "ann", ""};
    acknowledgements.result = AcknowledgementChange::TAKEN;
    EXPECT_EQ(send("POST", url, body),
              "409 id: episode 7 was acknowledged by ann at 1970-01-01T00:00:01.000Z; withdraw "
              "that first");
    acknowledgements.result = AcknowledgementChange::RESOLVED;
    EXPECT_TRUE(send("POST", url, body).starts_with("409 id: episode 7 is resolved"));
    acknowledgements.result = AcknowledgementChange::NOT_TAKEN;
    EXPECT_TRUE(send("DELETE", url, "").starts_with("409 id: nobody has acknowledged episode 7"));
    acknowledgements.result = refused("the history cannot be written now", "try again");
    EXPECT_TRUE(send("POST", url, body).starts_with("503 "));
}

TEST_F(EpisodesResourceTest, AnAcknowledgementHasANameAndBoundedTexts) {
    const std::string url = "/api/v1/episodes/7/ack";
    const std::string longText(1025, 'x');
    history.storedEpisodes = {episode(7)};
    EXPECT_TRUE(send("POST", url, "{}").starts_with("400 who: "));
    EXPECT_TRUE(send("POST", url, R"({"who":""})").starts_with("400 who: "));
    EXPECT_TRUE(send("POST", url, R"({"who":5})").starts_with("400 who: "));
    EXPECT_TRUE(send("POST", url, R"({"who":")" + longText + R"("})").starts_with("400 who: "));
    EXPECT_TRUE(
        send("POST", url, R"({"who":"a","note":")" + longText + R"("})").starts_with("400 note: "));
    EXPECT_TRUE(send("POST", url, R"({"who":"a","why":""})").starts_with("400 why: "));
    EXPECT_EQ(acknowledgements.last, 0u) << "nothing was changed";
}

} // namespace
