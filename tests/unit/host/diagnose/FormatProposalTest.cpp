#include "host/diagnose/FormatProposal.h"

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
    EXPECT_EQ(proposeFormat(lines)->patterns.size(), 2U);
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
