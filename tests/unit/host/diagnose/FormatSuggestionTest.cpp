#include "host/diagnose/FormatSuggestion.h"

#include "host/config/ReadyFormats.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <string>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::HasSubstr;
using testing::IsEmpty;

FormatSuggestion suggest(const std::vector<std::string>& lines) {
    return FormatSuggestion::of(ReadyFormats({ZRM_FORMATS}), lines, "/srv/the.log");
}

TEST(FormatSuggestion, EachFormatIsSuggestedForItsOwnSamples) {
    for (const ReadyFormats::Place& place : ReadyFormats({ZRM_FORMATS}).list()) {
        const auto ready = ReadyFormats::load(place);
        ASSERT_TRUE(ready) << ready.error().front();
        if (ready->format.type == "syslog") {
            continue; // they read the same lines: see below
        }
        std::vector<std::string> lines;
        for (const ReadyFormat::Sample& sample : ready->samples) {
            for (std::size_t at = 0; !sample.isRejected && at <= sample.entry.size();) {
                const std::size_t end = std::min(sample.entry.find('\n', at), sample.entry.size());
                lines.push_back(sample.entry.substr(at, end - at));
                at = end + 1;
            }
        }
        const FormatSuggestion suggestion = suggest(lines);
        std::vector<std::string> names;
        for (const FormatSuggestion::Choice& choice : suggestion.ready()) {
            names.insert(names.end(), choice.names.begin(), choice.names.end());
        }
        EXPECT_THAT(names, testing::Contains(place.name));
    }
}

TEST(FormatSuggestion, TheBestComesFirstWithTheTableToWrite) {
    const FormatSuggestion suggestion = suggest(
        {R"(203.0.113.7 - - [19/Nov/2026:10:00:00 +0100] "GET / HTTP/1.1" 200 5 "-" "x" 0.1)",
         "broken"});
    ASSERT_FALSE(suggestion.ready().empty());
    const FormatSuggestion::Choice& best = suggestion.ready().front();
    ASSERT_EQ(best.names.size(), 1U);
    EXPECT_THAT(best.names.front(), HasSubstr("-access"));
    EXPECT_EQ(best.fit.fitting, 1U);
    EXPECT_EQ(best.table,
              "[[log]]\npath = '/srv/the.log'\nformat = '" + best.names.front() + "'\n");
}

TEST(FormatSuggestion, SyslogFormatsThatFindFieldsAreNamedTogether) {
    const FormatSuggestion suggestion = suggest(
        {"Nov 19 10:00:00 web1 sshd[1]: Failed password for root from 203.0.113.7 port 1 ssh2",
         "Nov 19 10:00:01 web1 sudo: anna : TTY=pts/0 ; PWD=/ ; USER=root ; COMMAND=/bin/ls",
         "Nov 19 10:00:02 web1 app: text"});
    ASSERT_FALSE(suggestion.ready().empty());
    EXPECT_THAT(suggestion.ready().front().names, ElementsAre("sshd", "sudo"));
    EXPECT_THAT(suggestion.ready().front().table, HasSubstr("format = ['sshd', 'sudo']\n"));
    const FormatSuggestion plain = suggest({"Nov 19 10:00:02 web1 app: text"});
    ASSERT_FALSE(plain.ready().empty());
    EXPECT_THAT(plain.ready().front().names, IsEmpty());
    EXPECT_THAT(plain.ready().front().table, HasSubstr("type = 'syslog'\n"));
}

TEST(FormatSuggestion, AFormatIsMadeWhereNoReadyOneFits) {
    const FormatSuggestion made = suggest({"WARN 2026-11-19 10:00:00 | no room"});
    ASSERT_TRUE(made.proposal());
    EXPECT_THAT(made.proposal()->names, IsEmpty());
    EXPECT_THAT(made.proposal()->table, HasSubstr("type = 'regex'\nformat = "));
    EXPECT_DOUBLE_EQ(made.proposal()->fit.share(), 1);
    EXPECT_THAT(suggest({"Lorem ipsum"}).proposal(), testing::Eq(std::nullopt));
}

TEST(FormatSuggestion, AFormatIsMadeWhereItFindsMoreThanAGenericOne) {
    // A generic one reads the lines and finds no source.
    const FormatSuggestion made =
        suggest({"2026-11-19 10:00:00,123 INFO [main] org.shop.Flow Launching",
                 "2026-11-19 10:00:01,123 WARN [Timer-3] org.shop.Task Yielding"});
    ASSERT_TRUE(made.proposal());
    EXPECT_EQ(made.proposal()->fit.withSource, 2U);
    ASSERT_FALSE(made.ready().empty());
    EXPECT_LT(made.ready().front().fit.withSource, 2U);
    // One of the program that wrote the lines knows better what a connection is.
    const FormatSuggestion own = suggest(
        {"2026-11-19 10:00:00.123 CET [1234] LOG C-0x55d5c8: shop/anna@10.0.0.1:51234 login",
         "2026-11-19 10:00:02.123 CET [1234] ERROR S-0x55d5c9: shop/anna@10.0.0.1:51234 gone"});
    EXPECT_FALSE(own.proposal());
    ASSERT_FALSE(own.ready().empty());
    EXPECT_THAT(own.ready().front().names, ElementsAre("pgbouncer"));
}

TEST(FormatSuggestion, AFormatOfAnotherProgramThatFindsTheTimeAloneIsNoBetter) {
    const std::vector<std::string> lines = {"2026-11-19 10:00:00 SYSTEM STATS: Time:1.2 Hosts:17",
                                            "2026-11-19 10:00:01 the queue is empty"};
    const auto made = [&](std::string_view log) {
        return FormatSuggestion::of(ReadyFormats({ZRM_FORMATS}), lines, log);
    };
    ASSERT_FALSE(made("/srv/app.log").ready().empty());
    EXPECT_THAT(made("/srv/app.log").ready().front().names, ElementsAre("exim"));
    EXPECT_TRUE(made("/srv/app.log").proposal());
    EXPECT_FALSE(made("/var/log/exim/mainlog").proposal());
}

TEST(FormatSuggestion, TheTableOfAProposalHasAllThatItNeeds) {
    const FormatSuggestion made = suggest({"2026-11-19 10:00:00.123456 W | op-osd: slow a=1",
                                           "  further", "2026-11-19 10:00:01.5 E | op-osd: b=2"});
    ASSERT_TRUE(made.proposal());
    EXPECT_THAT(made.proposal()->table, HasSubstr("'W' = 'WARNING'"));
    EXPECT_THAT(made.proposal()->table, HasSubstr("\nentry = { starts = '^"));
    EXPECT_THAT(made.proposal()->table, HasSubstr("\npairs = true\n"));
}

TEST(FormatSuggestion, OfEqualFormatsTheOneThatThePathNamesComesFirst) {
    const std::vector<std::string> lines = {
        R"(203.0.113.7 - - [19/Nov/2026:10:00:00 +0100] "GET / HTTP/1.1" 200 5 "-" "x")"};
    const auto best = [&](std::string_view log) {
        return FormatSuggestion::of(ReadyFormats({ZRM_FORMATS}), lines, log).ready().front();
    };
    EXPECT_THAT(best("/var/log/nginx/access.log").names, ElementsAre("nginx-access"));
    EXPECT_THAT(best("/var/log/nginx/access.log").equals, testing::Contains("apache-access"));
    EXPECT_THAT(best("/var/log/httpd/access_log").names, ElementsAre("apache-access"));
    EXPECT_THAT(best("/srv/access.log").names, ElementsAre("apache-access"));
    EXPECT_THAT(best("/srv/access.log").equals, testing::Contains("nginx-access"));
}

TEST(FormatSuggestion, LooksAtABoundedPartOfWhatItIsGiven) {
    const FormatSuggestion suggestion =
        suggest(std::vector<std::string>(3000, "level=info " + std::string(50, 'x')));
    EXPECT_EQ(suggestion.lines(), FormatSuggestion::mostLines);
    EXPECT_EQ(suggest({}).lines(), 0U);
    EXPECT_THAT(suggest({}).ready(), IsEmpty());
    EXPECT_THAT(suggest({std::string(1000000, '{')}).ready(), IsEmpty());
}

TEST(FormatSuggestion, IsAnsweredAsJson) {
    const auto json =
        nlohmann::json::parse(suggest({"time=2026-11-19T10:00:00Z level=info msg=a"}).json());
    EXPECT_EQ(json.at("lines"), 1);
    EXPECT_EQ(json.at("ready").at(0).at("percent"), 100.0);
    EXPECT_EQ(json.at("ready").at(0).at("percent_time"), 100.0);
    EXPECT_TRUE(json.at("ready").at(0).at("fits_equally").is_array());
    EXPECT_TRUE(json.at("proposal").is_null());
}

} // namespace
