#include "ProgramTest.h"

#include <gmock/gmock.h>

#include <string>

namespace {

using testing::AllOf;
using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;

/// What commands show of the agent's answers.
using ListingsTest = ProgramTest;

const std::string silence =
    R"({"id":3,"state":"active","match":{"situation":"disk*","group":{"ip":"10.*"}},)"
    R"("created":"2026-11-22T10:00:00.000Z","until":"2026-11-22T12:00:00.000Z","expired":null,)"
    R"("who":"anna","why":"new disk","events":7,"last":"2026-11-22T11:00:00.000Z"})";

TEST_F(ListingsTest, SilencesAreListedWithWhatTheyMatch) {
    answerWith(R"({"silences":[)" + silence + R"(],"kept":false})");
    EXPECT_EQ(run({"silence"}), CliStatus::DONE);
    EXPECT_THAT(output, AllOf(HasSubstr("MATCHES"), HasSubstr("situation=disk* group.ip=10.*"),
                              HasSubstr("anna"), HasSubstr("new disk")));
    EXPECT_THAT(errors, HasSubstr("silences end with the agent"));
    answerWith(R"({"silences":[],"kept":true})");
    EXPECT_EQ(run({"silence", "list"}), CliStatus::REFUSED);
    EXPECT_EQ(errors, "zrmctl: no silence is active\n");
    EXPECT_EQ(run({"silence", "list", "--expired"}), CliStatus::REFUSED);
    EXPECT_EQ(errors, "zrmctl: there are no silences\n");
}

TEST_F(ListingsTest, ASilenceIsShownCreatedAndExpired) {
    std::string asked;
    answerBy([&](const HttpRequest& request) {
        asked = request.method + ' ' + request.path + ' ' + request.body;
        return HttpAnswer::json(silence);
    });
    EXPECT_EQ(run({"silence", "show", "3"}), CliStatus::DONE);
    EXPECT_EQ(copy(asked), "GET /api/v1/silences/3 ");
    EXPECT_THAT(output, AllOf(HasSubstr("new disk"), HasSubstr("events"), HasSubstr("7")));
    EXPECT_EQ(run({"silence", "show", "3", "--json"}), CliStatus::DONE);
    EXPECT_EQ(output, silence + '\n');
    EXPECT_EQ(run({"silence", "add", "--situation", "disk*", "--group", "ip=10.*", "--for", "2h",
                   "--why", "new disk", "--who", "anna"}),
              CliStatus::DONE);
    EXPECT_EQ(copy(asked), R"(POST /api/v1/silences {"match":{"situation":"disk*",)"
                           R"("group":{"ip":"10.*"}},"until":"2h","who":"anna","why":"new disk"})");
    EXPECT_THAT(output, HasSubstr("silence 3 lasts until "));
    EXPECT_EQ(run({"silence", "expire", "3", "--who", "ben"}), CliStatus::DONE);
    EXPECT_THAT(copy(asked), HasSubstr("/api/v1/silences/3"));
    EXPECT_THAT(output, AllOf(HasSubstr("silence 3 has expired"), HasSubstr("7 events")));
}

TEST_F(ListingsTest, ASilenceThatMatchesNothingInParticularIsRefused) {
    EXPECT_EQ(run({"silence", "add", "--for", "2h", "--why", "x"}), CliStatus::USAGE);
    EXPECT_THAT(errors, HasSubstr("--all silences every event"));
    EXPECT_EQ(run({"silence", "add", "--all", "--why", "x"}), CliStatus::USAGE);
    EXPECT_THAT(errors, HasSubstr("say how long: --for 2h"));
    EXPECT_EQ(run({"silence", "add", "--group", "ip", "--for", "2h", "--why", "x"}),
              CliStatus::USAGE);
    EXPECT_THAT(errors, HasSubstr("--group: write NAME=PATTERN in place of 'ip'"));
}

const std::string episode =
    R"({"id":17,"state":"open","situation":"ssh","severity":"major","group":{"ip":"10.0.0.7"},)"
    R"("count":5,"first":"2026-11-22T10:00:00.000Z","last":"2026-11-22T10:01:00.000Z",)"
    R"("raised":"2026-11-22T10:01:00.000Z","logs":[{"log":"/var/log/auth.log","count":5}],)"
    R"("events":[{"id":17,"state":"raised"}]})";

TEST_F(ListingsTest, EpisodesAreListedAndShown) {
    std::string query;
    answerBy([&](const HttpRequest& request) {
        for (const auto& [key, value] : request.query) {
            query += key + '=' + value + '&';
        }
        return HttpAnswer::json(R"({"episodes":[)" + episode + "]}");
    });
    EXPECT_EQ(run({"episodes", "--state", "open", "--situation", "ssh", "--limit", "5"}),
              CliStatus::DONE);
    EXPECT_THAT(copy(query),
                AllOf(HasSubstr("state=open"), HasSubstr("situation=ssh"), HasSubstr("limit=5")));
    EXPECT_THAT(output, AllOf(HasSubstr("GROUP"), HasSubstr("ip=10.0.0.7"), HasSubstr("open")));
    answerWith(R"({"episodes":[]})");
    EXPECT_EQ(run({"episodes"}), CliStatus::REFUSED);
    EXPECT_EQ(errors, "zrmctl: no such episode\n");
    answerWith(episode);
    EXPECT_EQ(run({"episodes", "show", "17"}), CliStatus::DONE);
    EXPECT_THAT(output, AllOf(HasSubstr("/var/log/auth.log, 5 entries"), HasSubstr("17, raised"),
                              HasSubstr("ip=10.0.0.7")));
}

std::string event(int id, const std::string& state, int count) {
    return R"({"id":)" + std::to_string(id) +
           R"(,"situation":"ssh","severity":"major","raised":"2026-11-22T10:0)" +
           std::to_string(id % 10) + R"(:00.000Z","text":"failed logins","state":")" + state +
           R"(","episode":{"id":17,"raised":"2026-11-22T10:07:00.000Z","count":)" +
           std::to_string(count) +
           R"(,"first":"2026-11-22T10:00:00.000Z","last":"2026-11-22T10:08:00.000Z"},)"
           R"("log":"/var/log/auth.log","node":"web1:ZRM"})";
}

TEST_F(ListingsTest, TheEventsOfAnEpisodeAreOneLine) {
    answerWith(R"({"events":[)" + event(17, "raised", 5) + ',' + event(18, "resolved", 9) + "]}");
    EXPECT_EQ(run({"events"}), CliStatus::DONE);
    EXPECT_THAT(output, AllOf(HasSubstr("resolved"), HasSubstr("9"), HasSubstr("failed logins")));
    EXPECT_THAT(output, Not(HasSubstr("Resolved: ")));
    const std::string oneLine = output;
    EXPECT_EQ(run({"events", "--all"}), CliStatus::DONE);
    EXPECT_THAT(output, HasSubstr("Resolved: failed logins"));
    EXPECT_GT(output.size(), oneLine.size());
}

TEST_F(ListingsTest, RulesAndFormatsOfADirectoryAreListedShownAndTested) {
    const std::string text = "description = \"A test's rule\"\n";
    directory.write("own.toml", text);
    const std::string place = directory.path().string();
    EXPECT_EQ(run({"rules", "--directory", place, "show", "own"}), CliStatus::REFUSED);
    EXPECT_THAT(errors, HasSubstr("own.toml"));
    EXPECT_EQ(run({"rules", "test", place + "/own.toml"}), CliStatus::REFUSED);
    EXPECT_THAT(output, HasSubstr("own.toml:1: situation: is missing"));
    EXPECT_EQ(run({"rules", "--directory", place, "show", "nothing"}), CliStatus::REFUSED);
    EXPECT_THAT(errors, HasSubstr("'nothing' is not a ready situation"));
    directory.write("plain.toml", "description = \"Plain lines\"\ntype = \"regex\"\n"
                                  "format = '(?P<description>.*)'\n\n[[sample]]\n"
                                  "entry = \"hello\"\ndescription = \"hello\"\n");
    EXPECT_EQ(run({"formats", "--directory", place, "show", "plain"}), CliStatus::DONE);
    EXPECT_THAT(output, HasSubstr("Plain lines"));
    EXPECT_EQ(run({"formats", "--directory", place, "test", "plain"}), CliStatus::DONE) << errors;
    EXPECT_THAT(output, EndsWith("1 samples, 0 formats failed\n"));
    EXPECT_EQ(run({"formats", "--directory", place, "list"}), CliStatus::DONE);
    EXPECT_THAT(output, HasSubstr("Plain lines"));
}

} // namespace
