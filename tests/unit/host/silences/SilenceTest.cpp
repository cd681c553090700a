#include "host/silences/Silence.h"

#include "host/base/JsonWriter.h"
#include "host/silences/SilenceJson.h"
#include "support/ReasonOf.h"

#include <gtest/gtest.h>

#include <string>

using namespace zrm::host;

namespace {

constexpr std::int64_t now = 1'795'158'189'412; // 2026-11-20T07:03:09.412Z
constexpr std::int64_t hour = 3'600'000;

SilenceRequest requestFor(SilenceMatch match) {
    return {std::move(match), false, "2h", "anna", "maintenance"};
}

SilenceMatch ofSituation(std::string name) {
    SilenceMatch match;
    match.situation = std::move(name);
    return match;
}

TEST(Silence, BeginsAtOnceAndEndsAfterADurationOrAtATime) {
    SilenceRequest request = requestFor(ofSituation("disk"));
    const Silence silence = request.check(now).value();
    EXPECT_EQ(silence.created, now);
    EXPECT_EQ(silence.until, now + 2 * hour);
    EXPECT_EQ(silence.match, ofSituation("disk"));
    EXPECT_TRUE(silence.isActive(now));
    EXPECT_TRUE(silence.isActive(silence.until - 1));
    EXPECT_FALSE(silence.isActive(silence.until));
    request.until = "2026-11-20T08:00:00Z";
    EXPECT_EQ(request.check(now).value().until, now - now % hour + hour);
}

TEST(Silence, EndsEarlyWhenItIsExpired) {
    Silence silence = requestFor(ofSituation("disk")).check(now).value();
    silence.expired = now + 1;
    EXPECT_TRUE(silence.isActive(now));
    EXPECT_FALSE(silence.isActive(now + 1));
    silence.expired = silence.until + 1;
    EXPECT_EQ(silence.end(), silence.until);
}

TEST(Silence, SaysWhatIsWrong) {
    const auto problemOf = [](const SilenceRequest& request) {
        const auto checked = request.check(now);
        return checked ? "" : checked.error().field + ": " + checked.error().text();
    };
    EXPECT_EQ(problemOf(requestFor({})),
              "match: is empty, so it would silence every event; name a situation, log, severity, "
              "node or group, or write \"all\": true");
    SilenceRequest request = requestFor({});
    request.isAll = true;
    EXPECT_EQ(problemOf(request), "");
    request.match = ofSituation("disk");
    EXPECT_EQ(problemOf(request),
              "match.all: every event is silenced, whatever else is named; leave one out");
    request = requestFor(ofSituation("disk"));
    request.until = "2026-11-20T07:03:09.412Z";
    EXPECT_EQ(problemOf(request), "until: '2026-11-20T07:03:09.412Z' is in the past; write a time "
                                  "after now, or for example 2h");
    request.until = "tomorrow";
    EXPECT_EQ(problemOf(request), "until: 'tomorrow' is neither a duration nor a time; write for "
                                  "example 2h, or 2026-11-20T07:30:00Z");
    request = requestFor(ofSituation("disk"));
    request.who = "";
    EXPECT_EQ(problemOf(request), "who: is empty; write something: others will read it");
    request.who = std::string(1025, 'x');
    EXPECT_EQ(problemOf(request), "who: has 1025 bytes; write at most 1024");
    SilenceMatch match;
    match.severity = "fatal";
    EXPECT_EQ(problemOf(requestFor(match)),
              "match.severity: 'fatal' matches no severity; write info, minor, warning, major or "
              "critical");
    match.severity = "m*";
    EXPECT_EQ(problemOf(requestFor(match)), "");
    match.group.assign(17, {"n", "v"});
    EXPECT_EQ(problemOf(requestFor(match)), "match.group: has more than 16 names");
    match.group = {{"ip", std::string(1025, '1')}};
    EXPECT_EQ(problemOf(requestFor(match)), "match.group.ip: has 1025 bytes; write at most 1024");
}

TEST(SilenceJson, WritesAndReadsWhatASilenceMatches) {
    SilenceMatch match = ofSituation("ssh-*");
    match.log = "/var/log/\xC3\xBC.log";
    match.group = {{"ip", "10.0.0.1"}, {"user", ""}};
    EXPECT_EQ(SilenceJson::match(match),
              "{\"situation\":\"ssh-*\",\"log\":\"/var/log/\xC3\xBC.log\","
              "\"group\":{\"ip\":\"10.0.0.1\",\"user\":\"\"}}");
    EXPECT_EQ(SilenceJson::parseMatch(SilenceJson::match(match)), match);
    EXPECT_EQ(SilenceJson::match({}), "{\"all\":true}");
    EXPECT_EQ(SilenceJson::parseMatch("{\"all\":true}"), SilenceMatch());
}

TEST(SilenceJson, ADamagedMatchNeverMeansEverything) {
    for (const char* const text :
         {"", "{", "{}", "[]", "7", "{\"situation\":7}", "{\"group\":7}", "{\"group\":{\"ip\":1}}",
          "{\"all\":false}", "{\"situation\":\"\"}"}) {
        EXPECT_EQ(SilenceJson::parseMatch(text), std::nullopt) << text;
    }
}

TEST(SilenceJson, WritesAllOfASilence) {
    Silence silence = requestFor(ofSituation("disk")).check(now).value();
    silence.id = 7;
    const auto text = [&](std::int64_t time) {
        return JsonWriter::text([&](JsonWriter& json) { SilenceJson::write(json, silence, time); });
    };
    EXPECT_EQ(text(now),
              R"({"id":7,"state":"active","match":{"situation":"disk"},)"
              R"("created":"2026-11-20T07:03:09.412Z","until":"2026-11-20T09:03:09.412Z",)"
              R"("who":"anna","why":"maintenance","expired":null,"expired_by":null,"events":0,)"
              R"("last":null})");
    silence.expired = now + 1;
    silence.expiredBy = "ben";
    silence.events = 3;
    silence.last = now;
    EXPECT_EQ(text(now + 1),
              R"({"id":7,"state":"expired","match":{"situation":"disk"},)"
              R"("created":"2026-11-20T07:03:09.412Z","until":"2026-11-20T09:03:09.412Z",)"
              R"("who":"anna","why":"maintenance","expired":"2026-11-20T07:03:09.413Z",)"
              R"("expired_by":"ben","events":3,"last":"2026-11-20T07:03:09.412Z"})");
}

} // namespace
