#include "host/diagnose/FormatProposal.h"

#include "base/EntryFields.h"
#include "host/diagnose/FormatFit.h"

#include <gtest/gtest.h>

#include <random>
#include <string>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

/// The row that the format made from these lines gives of the last one.
struct Proposed {
    explicit Proposed(const std::vector<std::string>& lines) : line(lines.back()) {
        const auto description = proposeFormat(lines);
        if (!description) {
            ADD_FAILURE() << "no proposal";
            return;
        }
        format = makeFormat(*description).value();
        reader = format->reader();
        EXPECT_TRUE(reader->read(line, columns)) << description->patterns.front();
        share = FormatFit::of(*description, lines).value().share();
    }
    const std::string line; // the columns are views into it
    std::shared_ptr<const EntryFormat> format;
    std::unique_ptr<EntryFormat::Reader> reader;
    EntryColumns columns;
    double share = 0;
};

TEST(FormatProposal, FindsTimeLevelSourceAndMessage) {
    const Proposed one({"2026-11-19 10:00:00.123 <WARN> [worker-1] com.example.Cart - no room",
                        "2026-11-19 10:00:01.001 <INFO> [main] com.example.Main - started"});
    EXPECT_DOUBLE_EQ(one.share, 1);
    EXPECT_TRUE(one.columns.hasTime);
    EXPECT_EQ(one.columns.time.second, 1U);
    EXPECT_EQ(one.columns.type, "INFO");
    EXPECT_EQ(one.columns.source, "com.example.Main");
    EXPECT_EQ(one.columns.description, "started");
}

TEST(FormatProposal, TheTimeMayStandInBracketsOrBehindTheLevel) {
    const Proposed bracket({"[19/Nov/2026:10:00:00 +0100] ERROR db: gone"});
    EXPECT_EQ(bracket.columns.offset, 3600);
    EXPECT_EQ(bracket.columns.type, "ERROR");
    EXPECT_EQ(bracket.columns.source, "db");
    EXPECT_EQ(bracket.columns.description, "gone");
    const Proposed behind({"NOTICE 2026/11/19 10:00:00 queue is empty"});
    EXPECT_TRUE(behind.columns.hasTime);
    EXPECT_EQ(behind.columns.type, "NOTICE");
    EXPECT_EQ(behind.columns.description, "queue is empty");
}

TEST(FormatProposal, ColumnsMayBeSeparatedByBars) {
    const Proposed one({"2026-11-19 10:00:00|WARN|4711|shop.cart|no room"});
    EXPECT_EQ(one.columns.type, "WARN");
    EXPECT_EQ(one.columns.source, "shop.cart");
    EXPECT_EQ(one.columns.description, "no room");
}

TEST(FormatProposal, SeveralShapesGiveSeveralPatterns) {
    std::vector<std::string> lines;
    for (int i = 0; i < 10; ++i) {
        lines.push_back("2026-11-19 10:00:0" + std::to_string(i) + " INFO started");
        lines.push_back("2026-11-19 10:00:0" + std::to_string(i) + " [main] [WARN] slow");
    }
    EXPECT_DOUBLE_EQ(Proposed(lines).share, 1);
    // The two, and one for lines that end behind the time.
    EXPECT_EQ(proposeFormat(lines)->patterns.size(), 3U);
}

/// Of one line, as text: level, source and message.
std::string columnsOf(const std::vector<std::string>& lines) {
    const Proposed one(lines);
    return std::string(one.columns.type) + '|' + std::string(one.columns.source) + '|' +
           std::string(one.columns.description);
}

TEST(FormatProposal, FindsTheLevelInBracketsBehindTheSource) {
    EXPECT_EQ(columnsOf({"2026-11-19 10:00:00 com.example.Cart [WARN] no room"}),
              "WARN|com.example.Cart|no room");
    EXPECT_EQ(columnsOf({"Nov 19 10:00:00 phone board(Front)[60] <Notice>: brightness changed"}),
              "Notice|board(Front)[60]|brightness changed");
    EXPECT_EQ(columnsOf({"2026-11-19 10:00:00 +0100 Puppet (notice): applied"}),
              "notice|Puppet|applied");
    EXPECT_EQ(columnsOf({"[2026-11-19 10:00:00 +0100] critical/Listener: no port"}),
              "critical|Listener|no port");
    EXPECT_EQ(columnsOf({"[2026-11-19T10:00:00.123+01:00] request.INFO: matched"}),
              "INFO|request|matched");
}

TEST(FormatProposal, FindsColumnsBetweenTabsBarsAndSemicolons) {
    EXPECT_EQ(columnsOf({"2026-11-19T10:00:00.123Z\tINFO\tmain\tio.shop.Cart\tno room"}),
              "INFO|io.shop.Cart|no room");
    EXPECT_EQ(columnsOf({"2026-11-19 10:00:00 | INFO | shop.cart:reserve:77 - no room"}),
              "INFO|shop.cart:reserve:77|no room");
    EXPECT_EQ(columnsOf({"2026-11-19 10:00:00,INFO,cart,a, b", "2026-11-19 10:00:01,WARN,net,c"}),
              "WARN|net|c");
    EXPECT_EQ(columnsOf({"19.11.2026 10:00:00;ERROR;no room"}), "ERROR||no room");
    EXPECT_EQ(columnsOf({"2026-11-19 10:00:00;WARN;4711;shop.cart;no room"}),
              "WARN|shop.cart|no room");
}

TEST(FormatProposal, FindsSecondsSince1970InTheMiddleOfALine) {
    const Proposed one({"[INFO] [1795078801.5] [nav.planner]: started"});
    EXPECT_TRUE(one.columns.hasTime);
    EXPECT_EQ(one.columns.time.second, 1U);
    EXPECT_EQ(one.columns.source, "nav.planner");
    EXPECT_EQ(one.columns.description, "started");
    const Proposed event({"4711 node-246 unix.hw state 1795078800 1 WARN fan is slow"});
    EXPECT_TRUE(event.columns.hasTime);
    EXPECT_EQ(event.columns.type, "WARN");
    EXPECT_EQ(event.columns.description, "fan is slow");
}

TEST(FormatProposal, PairsAndQuotedTextsInFrontOfTheLevelAreFields) {
    const std::string line = R"(2026-11-19T10:00:00Z pid=17 "shop cart" WARN: no room order=4711)";
    const auto description = proposeFormat({line});
    ASSERT_TRUE(description);
    EXPECT_TRUE(description->pairs);
    const auto format = makeFormat(*description).value();
    const auto reader = format->reader();
    EntryColumns columns;
    ASSERT_TRUE(reader->read(line, columns));
    EXPECT_EQ(columns.description, "no room order=4711");
    EntryFields fields;
    reader->readFields(line, fields);
    ASSERT_NE(fields.find("pid"), nullptr);
    EXPECT_EQ(*fields.find("pid"), "17");
    ASSERT_NE(fields.find("part1"), nullptr);
    EXPECT_EQ(*fields.find("part1"), "shop cart");
    ASSERT_NE(fields.find("order"), nullptr);
    EXPECT_EQ(*fields.find("order"), "4711");
}

TEST(FormatProposal, WritesOutLevelsOfOneLetter) {
    EXPECT_EQ(columnsOf({"2026-11-19 10:00:00.123456 W | op-osd: slow"}), "WARNING|op-osd|slow");
    EXPECT_EQ(columnsOf({"I1119 10:00:00.123456    1234 server.go:415] ready"}),
              "INFO|server.go:415|ready");
}

TEST(FormatProposal, ADashSeparatesTheSourceFromTheMessage) {
    EXPECT_EQ(columnsOf({"2026-11-19 10:00:00,123\tINFO worker.py:1528 -- started"}),
              "INFO|worker.py:1528|started");
    EXPECT_EQ(columnsOf({"2026-11-19 10:00:00,123 WARN [qtp1-4:/x] [name=a;ip=b;] soap - slow"}),
              "WARN|soap|slow");
}

TEST(FormatProposal, TheSampleSaysInWhichOrderDatesAre) {
    const auto orderOf = [](const std::vector<std::string>& lines) {
        return proposeFormat(lines).value().timeFormat;
    };
    EXPECT_EQ(orderOf({"30/10/2026 10:00:00 INFO a", "31/10/2026 10:00:00 INFO b",
                       "01/11/2026 10:00:00 INFO c", "02/11/2026 10:00:00 INFO d"}),
              "day-first");
    EXPECT_EQ(orderOf({"10/30/2026 10:00:00 INFO a", "11/01/2026 10:00:00 INFO b",
                       "11/02/2026 10:00:00 INFO c"}),
              "");
    EXPECT_EQ(orderOf({"10/30/26 10:00:00 INFO a", "10/11/26 10:00:00 INFO b"}), "month-first");
    EXPECT_EQ(orderOf({"26/10/30 10:00:00 INFO a", "26/11/01 10:00:00 INFO b"}), "");
    const Proposed one({"31/10/2026 10:00:00 INFO b", "01/11/2026 10:00:00 INFO c"});
    EXPECT_EQ(one.columns.time.month, 11U);
    EXPECT_EQ(one.columns.time.day, 1U);
}

TEST(FormatProposal, FindsTimesThatStandInSeveralColumns) {
    const Proposed brackets({"[2026-11-19][10:00:01][shop::server][INFO] listening"});
    EXPECT_EQ(brackets.columns.time.second, 1U);
    EXPECT_EQ(brackets.columns.source, "shop::server");
    EXPECT_EQ(brackets.columns.description, "listening");
    const Proposed dashes({"19/11/2026 -- 10:00:01 - <Info> - CPUs online: 4"});
    EXPECT_EQ(dashes.columns.time.second, 1U);
    EXPECT_EQ(dashes.columns.type, "Info");
    EXPECT_EQ(dashes.columns.description, "CPUs online: 4");
    const Proposed mark({"%Nov 19 10:00:01:123 2026 SW1 IFNET/3/PHY_UPDOWN: changed to up"});
    EXPECT_TRUE(mark.columns.hasYear);
    EXPECT_EQ(mark.columns.time.second, 1U);
}

TEST(FormatProposal, ReadsSeveritiesWithinCodes) {
    EXPECT_EQ(columnsOf({"2026 Nov 19 10:00:00 sw1 %ETHPORT-5-IF_UP: Interface is up"}),
              "NOTICE|ETHPORT|Interface is up");
    EXPECT_EQ(columnsOf({"Nov 19 2026 10:00:00+01:00 SW1 %%01IFNET/4/LINK(l)[17]:Vlanif10 is up"}),
              "WARNING|IFNET|Vlanif10 is up");
    EXPECT_EQ(columnsOf({"2026-11-19 10:00:00 INFO ratio is 1-3-2: ok"}),
              "INFO||ratio is 1-3-2: ok");
}

TEST(FormatProposal, FindsLevelsBetweenOtherMarks) {
    EXPECT_EQ(columnsOf({"19.11.2026 10:00:00.123 *INFO* [main] org.example.log.Service started"}),
              "INFO|org.example.log.Service|started");
    EXPECT_EQ(columnsOf({"2026-11-19T10:00:00Z [1] WARNING [3ad54] {engines} slow sync"}),
              "WARNING|engines|slow sync");
    EXPECT_EQ(columnsOf({"2026-11-19 10:00:00 UTC - [Parent 1: Main]: D/nsHttp Handler::Init"}),
              "DEBUG|nsHttp|Handler::Init");
    EXPECT_EQ(columnsOf({"2026-11-19T10:00:00 [vm:api:INFO:src/main.rs:117] running"}),
              "INFO|api|running");
    EXPECT_EQ(columnsOf({"2026-11-19 10:00:00 *** WARNING *** retrying"}), "WARNING||retrying");
    EXPECT_EQ(columnsOf({"2026-11-19 10:00:00 8509 2 I database: no such table"}),
              "INFO|database|no such table");
    EXPECT_EQ(columnsOf({"ERROR - 2026-11-19 10:00:00 --> page not found"}),
              "ERROR||page not found");
}

TEST(FormatProposal, WordsInUpperCaseAreLevelsOnlyWhereMostLinesHaveThem) {
    EXPECT_EQ(columnsOf({"Nov 19 10:00:00 [17] node1 corosync notice  [TOTEM ] formed",
                         "Nov 19 10:00:01 [17] node1 corosync warning [MAIN  ] no memory"}),
              "warning|MAIN|no memory");
    const std::vector<std::string> lines = {
        "2026-11-19 10:00:00 - the queue is empty", "2026-11-19 10:00:01 - one of many came",
        "2026-11-19 10:00:02 - a b c d ERROR NOTICE backtrace", "2026-11-19 10:00:03 - end"};
    EXPECT_EQ(columnsOf({lines[0], lines[1], lines[3], lines[2]}),
              "||a b c d ERROR NOTICE backtrace");
    EXPECT_EQ(
        columnsOf({"[2026-11-19 10:00:00] [Config] loaded", "[2026-11-19 10:00:01] [Hue] up"}),
        "|Hue|up");
}

TEST(FormatProposal, AWordInThePlaceOfTheLevelsIsOne) {
    EXPECT_EQ(columnsOf({"2026-11-19 10:00:00.1 P00   INFO: started",
                         "2026-11-19 10:00:01.1 P00   INFO: ready",
                         "2026-11-19 10:00:02.1 P01 DETAIL: backup file"}),
              "DETAIL|P01|backup file");
}

TEST(FormatProposal, BracketsBehindANameBelongToIt) {
    EXPECT_EQ(columnsOf({" 0(1234) INFO: tls [tls_mod.c:390]: With ECDH"}), "INFO|tls|With ECDH");
    EXPECT_EQ(columnsOf({"Nov 19 10:00:00 n1 pacemakerd   [1234] (read_config)  info: Reading"}),
              "info|pacemakerd|Reading");
    EXPECT_EQ(columnsOf({"2026-11-19 10:00:00 (main) [ERROR - org.shop.Cart.add(X.java:62)] Full"}),
              "ERROR|org.shop.Cart.add(X.java|Full");
}

TEST(FormatProposal, WhatEndsALineIsItsMessage) {
    EXPECT_EQ(columnsOf({"2026-11-19 10:00:00.123 zmdc[1234].INF [Starting pending process]"}),
              "INF|zmdc[1234]|[Starting pending process]");
}

TEST(FormatProposal, WordsThatAreAlignedToTheRightAreColumns) {
    EXPECT_EQ(columnsOf({"2026-11-19 10:00:00 INFO     general started", //
                         "2026-11-19 10:00:00 INFO     network is up",
                         "2026-11-19 10:00:00 INFO          ui is up"}),
              "INFO|ui|is up");
}

TEST(FormatProposal, ALoggerComesBeforeAPlaceInTheSource) {
    EXPECT_EQ(columnsOf({"INFO  2026-11-19 10:00:00,123 [shard 0] rpc - net/rpc.cc:412 - ready",
                         "INFO  2026-11-19 10:00:00,123 [shard 0] kafka - kafka.cc:17 - ready"}),
              "INFO|kafka|kafka.cc:17 - ready");
    EXPECT_EQ(columnsOf({"2026-11-19 10:00:00 I [1234:main] Shop::Server -- listening"}),
              "INFO|Shop::Server|listening");
}

TEST(FormatProposal, PairsBehindAPaddedMessageMakeNoColumnOfIt) {
    EXPECT_EQ(columnsOf({"ERRO[0013] failed                     error=x"}),
              "ERRO||failed                     error=x");
}

TEST(FormatProposal, WordsOfMessagesAreNoColumns) {
    const std::vector<std::string> lines = {
        "[2026-11-19 10:00:00] INFO starting", "[2026-11-19 10:00:01] INFO Config: 2 files",
        "[2026-11-19 10:00:02] INFO queue is empty", "[2026-11-19 10:00:03] INFO -- end"};
    EXPECT_EQ(columnsOf(lines), "INFO||-- end");
    EXPECT_EQ(columnsOf({lines[0], lines[2], lines[3], lines[1]}), "INFO||Config: 2 files");
    // A thread does not speak, and a number is none.
    EXPECT_EQ(columnsOf({"2026-11-19 10:00:00 [worker-3] INFO [4711] text"}), "INFO||text");
}

TEST(FormatProposal, LinesWithoutTheTimeContinueAnEntry) {
    const std::vector<std::string> lines = {"2026-11-19 10:00:00 | ERROR | shop.Cart - failed",
                                            "java.lang.IllegalStateException: no cart",
                                            "\tat shop.Cart.find(Cart.java:42)",
                                            "2026-11-19 10:00:01 | INFO | shop.Cart - stopped"};
    const Proposed one(lines);
    EXPECT_DOUBLE_EQ(one.share, 1);
    const auto join = makeLineJoin(*proposeFormat(lines)).value();
    ASSERT_NE(join, nullptr);
    EXPECT_TRUE(join->joins(lines[1], lines[2]));
    EXPECT_FALSE(join->joins(lines[2], lines[3]));
}

TEST(FormatProposal, LinesWithoutTimeAndLevelGiveNone) {
    EXPECT_FALSE(proposeFormat({}));
    EXPECT_FALSE(proposeFormat({"Lorem ipsum dolor", "sit amet", "", std::string(100000, 'x')}));
}

/// Whatever the lines are, what is proposed can be made.
TEST(FormatProposal, EveryProposalIsAFormat) {
    const unsigned seed = std::random_device()();
    std::mt19937 random(seed);
    const std::vector<std::string> parts = {"2026-11-19 10:00:00",
                                            "[",
                                            "]",
                                            "(",
                                            ")",
                                            "INFO",
                                            "<",
                                            ">",
                                            " ",
                                            "|",
                                            ":",
                                            "-",
                                            "a.b",
                                            "17",
                                            "Nov 19 10:00:00",
                                            "\\",
                                            "*",
                                            "x",
                                            "\t",
                                            "\xff",
                                            "=",
                                            "\"",
                                            ";",
                                            "W",
                                            "WARN",
                                            "key=",
                                            "name:",
                                            "1795078800",
                                            std::string(1, '\0')};
    for (int round = 0; round < 2000; ++round) {
        std::string line;
        for (auto i = random() % 12; i > 0; --i) {
            line += parts[random() % parts.size()];
        }
        if (const auto format = proposeFormat({line})) {
            const auto made = makeFormat(*format);
            ASSERT_TRUE(made) << "seed " << seed << ": " << made.error().text();
        }
    }
}

} // namespace
