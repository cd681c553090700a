#include "host/formats/LineRules.h"

#include "host/formats/FormatDescription.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <random>
#include <string>
#include <vector>

#include <re2/re2.h>

using namespace zrm;
using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::HasSubstr;

/// The entries that the rules make of lines, each as "line/line".
std::vector<std::string> join(const FormatDescription& description,
                              const std::vector<std::string>& lines) {
    const auto rules = LineRules::make(description);
    std::vector<std::string> entries;
    for (std::size_t i = 0; i < lines.size(); ++i) {
        if (i > 0 && (*rules)->joins(lines[i - 1], lines[i])) {
            entries.back() += '/' + lines[i];
        } else {
            entries.push_back(lines[i]);
        }
    }
    return entries;
}

std::string problemOf(const FormatDescription& description) {
    const auto rules = LineRules::make(description);
    return rules ? "" : rules.error().field + ": " + rules.error().text();
}

TEST(LineRules, WithoutRulesEachLineIsAnEntry) {
    EXPECT_EQ(*LineRules::make({}), nullptr);
}

TEST(LineRules, ALineThatMatchesBeginsAnEntry) {
    FormatDescription description;
    description.lines.starts = R"(^\d{4}-)";
    EXPECT_THAT(join(description, {"2026-11-19 a", "b", "", "\tat c", "2026-11-20 d", "20 e"}),
                ElementsAre("2026-11-19 a/b//\tat c", "2026-11-20 d/20 e"));
    description.lines.starts = "ERROR|WARN"; // anywhere in the line
    EXPECT_THAT(join(description, {"an ERROR", "b", "a WARN", "c"}),
                ElementsAre("an ERROR/b", "a WARN/c"));
}

TEST(LineRules, ALineThatMatchesContinuesAnEntry) {
    FormatDescription description;
    description.lines.continues = R"(^(?:\s|Caused by:|\.\.\.))";
    EXPECT_THAT(join(description, {"a", " b", "Caused by: c", "... 3 more", "", "d"}),
                ElementsAre("a/ b/Caused by: c/... 3 more", "", "d"));
}

TEST(LineRules, AnIndentedLineContinuesAnEntry) {
    FormatDescription description;
    description.lines.indented = true;
    EXPECT_THAT(join(description, {"a", " b", "\tc", "", " d", "e"}),
                ElementsAre("a/ b/\tc// d", "e"));
}

TEST(LineRules, LineEndsOfOtherSystemsDoNotCount) {
    FormatDescription description;
    description.lines.continues = "^$";
    EXPECT_THAT(join(description, {"a\r", "\r", "b\r"}), ElementsAre("a\r/\r", "b\r"));
}

TEST(LineRules, LinesOfTwoStreamsAreNotJoined) {
    FormatDescription description;
    description.unwrap = "cri";
    const std::string out = "2026-11-19T10:00:00Z stdout ";
    const std::string err = "2026-11-19T10:00:00Z stderr ";
    EXPECT_THAT(join(description, {out + "P a", err + "F b", out + "F c"}),
                ElementsAre(out + "P a", err + "F b", out + "F c"));
    description.lines.indented = true;
    EXPECT_THAT(join(description, {out + "F a", err + "F  b", err + "F  c", out + "F  d"}),
                ElementsAre(out + "F a", err + "F  b/" + err + "F  c", out + "F  d"));
}

TEST(LineRules, WhatARuntimeHasCutIsJoined) {
    FormatDescription description;
    description.unwrap = "cri";
    const std::string time = "2026-11-19T10:00:00Z stdout ";
    EXPECT_THAT(join(description,
                     {time + "P a", time + "P b", time + "F c", time + "F d", "odd", time + "F e"}),
                ElementsAre(time + "P a/" + time + "P b/" + time + "F c", time + "F d", "odd",
                            time + "F e"));
    description.unwrap = "docker";
    EXPECT_THAT(join(description, {R"({"log":"a"})", R"({"log":"b\n"})", R"({"log":"c\n"})"}),
                ElementsAre(R"({"log":"a"}/{"log":"b\n"})", R"({"log":"c\n"})"));
}

TEST(LineRules, AWholeLineOfAContainerNeedNotWait) {
    FormatDescription description;
    description.unwrap = "cri";
    const auto rules = *LineRules::make(description);
    EXPECT_TRUE(rules->isOpen("2026-11-19T10:00:00Z stdout P a"));
    EXPECT_FALSE(rules->isOpen("2026-11-19T10:00:00Z stdout F a\r"));
    EXPECT_FALSE(rules->isOpen("odd"));
    description.lines.indented = true;
    EXPECT_TRUE((*LineRules::make(description))->isOpen("2026-11-19T10:00:00Z stdout F a"));
}

TEST(LineRules, InAContainerTheProgramsLinesAreJudged) {
    FormatDescription description;
    description.unwrap = "docker";
    description.lines.indented = true;
    EXPECT_THAT(
        join(description, {R"({"log":"Error\n"})", R"({"log":"\tat a"})", R"({"log":"bc\n"})",
                           R"({"log":"next\n"})"}),
        ElementsAre(R"({"log":"Error\n"}/{"log":"\tat a"}/{"log":"bc\n"})", R"({"log":"next\n"})"));
}

TEST(LineRules, SaysWhatIsWrong) {
    FormatDescription description;
    description.lines.starts = "(";
    EXPECT_EQ(problemOf(description),
              "entry.starts: '(' is not a regular expression: missing ): (; "
              "see github.com/google/re2/wiki/Syntax");
    description.lines.starts = "(?:" + std::string(40, 'a') + "{1000}){1000}";
    EXPECT_THAT(problemOf(description), HasSubstr("entry.starts: "));
    description.lines.starts = std::string(5000, 'a');
    EXPECT_THAT(problemOf(description), HasSubstr("this one has 5000"));
    description.lines.starts = "a";
    description.lines.indented = true;
    EXPECT_THAT(problemOf(description), HasSubstr("entry: says in more than one way"));
    description.lines.indented = false;
    description.lines.limits.lines = 1;
    EXPECT_THAT(problemOf(description), HasSubstr("entry.lines: is less than 2"));
    description.lines.limits = {.bytes = 65'537};
    EXPECT_THAT(problemOf(description), HasSubstr("entry.bytes: is not between"));
    description = {};
    description.unwrap = "podman";
    EXPECT_THAT(problemOf(description), HasSubstr("unwrap: is not a container runtime's format"));
}

TEST(LineRules, EqualRulesHaveEqualDefinitions) {
    FormatDescription one;
    one.lines.starts = "a";
    FormatDescription other = one;
    EXPECT_EQ((*LineRules::make(one))->definition(), (*LineRules::make(other))->definition());
    other.lines.limits.wait = std::chrono::seconds(1);
    EXPECT_NE((*LineRules::make(one))->definition(), (*LineRules::make(other))->definition());
    other = one;
    std::swap(other.lines.starts, other.lines.continues);
    EXPECT_NE((*LineRules::make(one))->definition(), (*LineRules::make(other))->definition());
}

/// What decides most lines agrees with the library.
TEST(LinePattern, FindsWhatTheLibraryFinds) {
    const char* const patterns[] = {
        R"(^\d{4}-)", "^[A-F]x?",          "^a|b",    "^*b",          "^",         "^$",
        "b",          "^(a|b)c",           R"(^\s+)", "^(?i)ab",      "^[^a]",     "^.b",
        R"(^\W)",     "^\xc3\xa4",         "^a*b",    R"(^(?:a|b)c)", "^[|(]a|b",  "^(a)|b",
        R"(^\(|b)",   "^[[:alpha:]|b]c|b", "^[]|]|b", R"(^\Q(\E|b)",  "^(?:\\s|b)"};
    std::mt19937 random(7);
    for (const char* const text : patterns) {
        const auto pattern = LinePattern::compile(text);
        ASSERT_TRUE(pattern) << text;
        const re2::RE2 library(text, re2::RE2::Latin1);
        for (int round = 0; round < 2000; ++round) {
            std::string line;
            for (auto length = random() % 8; length > 0; --length) {
                line += "abcABx019- \t\xc3\xa4"[random() % 13];
            }
            ASSERT_EQ(pattern->matches(line), re2::RE2::PartialMatch(line, library))
                << text << " in '" << line << "'";
        }
    }
}

} // namespace
