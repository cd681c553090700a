#include "ParserProbe.h"

#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <vector>

using namespace zrm;

// The list of field names, and the table of keywords that it is matched against.

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

/// The field that a name alone names; "" when it is refused.
std::string fieldNamed(const std::string& name) {
    const ParserProbe parser("A,\"%d\"," + name);
    return parser.isLearned() ? parser.next()->fieldName() : "";
}

std::vector<std::string> errorsOf(const std::string& format,
                                  const _KeywordFields* fields = testKeywords) {
    RecordingTrace trace(TRC1_ERROR);
    const ParserProbe parser(format, fields);
    EXPECT_EQ(parser.status(), OBJECT_FAILED);
    EXPECT_EQ(parser.next(), nullptr) << "no partial chain";
    return trace.messages();
}

TEST(FieldNames, AreAcceptedFromTheMinimumToTheWholeKeyword) {
    for (int index = 0; testKeywords[index].minimum > 0; ++index) {
        const std::string keyword = testKeywords[index].keyword;
        for (std::size_t length = 1; length <= keyword.size(); ++length) {
            EXPECT_EQ(fieldNamed(keyword.substr(0, length)), length < 2 ? "" : keyword);
        }
        EXPECT_EQ(fieldNamed(keyword + "s"), "");
        const ParserProbe parser("A,\"%d\"," + keyword);
        EXPECT_EQ(parser.next()->printIndex(), index);
    }
    EXPECT_EQ(fieldNamed("mo"), "month");
    EXPECT_EQ(fieldNamed("mi"), "minute");
    EXPECT_EQ(fieldNamed("mon"), "month");
    EXPECT_EQ(fieldNamed("monday"), "");
    EXPECT_EQ(fieldNamed("m"), "");
    EXPECT_EQ(fieldNamed("Month"), "");
    EXPECT_EQ(fieldNamed("mo=\"%d\""), "month");
    EXPECT_EQ(fieldNamed("m=\"%d\""), "");
    for (const char* space : {" ", "\t", "\n", "\v", "\f", "\r"}) {
        EXPECT_EQ(fieldNamed("mo" + std::string(space) + "= \"%d\""), "month");
    }
}

TEST(FieldNames, TheFirstEntryThatMatchesWins) {
    constexpr _KeywordFields similar[] = {{"second", 3}, {"section", 3}, {"s", 1}, {nullptr, 0}};
    EXPECT_EQ(ParserProbe("A,\"%d\",sec", similar).next()->printIndex(), 0);
    EXPECT_EQ(ParserProbe("A,\"%d\",sect", similar).next()->printIndex(), 1);
    EXPECT_EQ(ParserProbe("A,\"%d\",s", similar).next()->printIndex(), 2);
}

TEST(FieldNames, AreCutAt15Characters) {
    constexpr _KeywordFields longName[] = {{"averylongkeywordindeed", 4}, {nullptr, 0}};
    const ParserProbe parser("A,\"%d\",averylongkeywordindeed", longName);
    ASSERT_TRUE(parser.isLearned());
    EXPECT_STREQ(parser.next()->fieldName(), "averylongkeywor");
}

TEST(FieldNames, AreInTheOrderOfTheDirectives) {
    const ParserProbe parser("A , \"%d-%*d-%d %s\" ,\tyear month = \"%02d\"  description ");
    ASSERT_TRUE(parser.isLearned());
    const char* const names[] = {"year", "*", "month", "description"};
    int number = 1;
    for (const char* name : names) {
        EXPECT_STREQ(parser.node(number++)->fieldName(), name);
    }
    EXPECT_STREQ(parser.node(3)->printDirective(), "%02d");
    EXPECT_EQ(parser.node(5), nullptr);
}

TEST(FieldNames, FailuresNameTheDirective) {
    EXPECT_THAT(errorsOf("A,\"%d %5s\",day"),
                ElementsAre("Error while processing directive #2;  %5s."));
    EXPECT_THAT(errorsOf("A,\"%d\","), ElementsAre("Error while processing directive #1; %d."));
    EXPECT_THAT(errorsOf("A,\"%*d%s\",nothing"),
                ElementsAre("Error while processing directive #2; %31s."));
}

TEST(FieldNames, NothingFollowsTheLast) {
    EXPECT_THAT(errorsOf("A,\"%d\",day month"),
                ElementsAre("Error: extraneous data included in format specifier:  month "));
    EXPECT_THAT(errorsOf("A,\"%d\",day = \"%d\" , "),
                ElementsAre("Error: extraneous data included in format specifier:  ,  "));
    EXPECT_THAT(errorsOf("A,\"%*d\",day"),
                ElementsAre("Error: extraneous data included in format specifier:  day "));
}

TEST(FieldNames, FollowTheClosingQuoteAndAComma) {
    EXPECT_THAT(errorsOf("A,\"%d\" day"), ElementsAre("Error found in format command; expected "
                                                      "\"\" , %n\", found \"\" day\". "));
    EXPECT_THAT(errorsOf("A,\"%d\""), ElementsAre("Error found in format command; expected \"\" , "
                                                  "%n\", found \"\"\". "));
    EXPECT_TRUE(ParserProbe("A,\"%d\"\n,\nday").isLearned());
}

// The table.

TEST(KeywordTable, MustHoldAnEntry) {
    constexpr _KeywordFields empty[] = {{"day", 0}};
    EXPECT_THAT(errorsOf("A,\"%d\",day", empty),
                ElementsAre("Internal error: valid keyword table is empty."));
    EXPECT_THAT(errorsOf("A,\"%d\",day", nullptr),
                ElementsAre("Internal error: valid keyword table is empty."));
}

TEST(KeywordTable, EntriesMustHaveAKeyword) {
    constexpr _KeywordFields missing[] = {{"day", 2}, {nullptr, 2}, {nullptr, 0}};
    EXPECT_THAT(errorsOf("A,\"%d\",day", missing),
                ElementsAre("Internal error: entry #2 in keyword table is invalid; keyword is "
                            "missing."));
    constexpr _KeywordFields empty[] = {{"", 1}, {nullptr, 0}};
    EXPECT_THAT(errorsOf("A,\"%d\",day", empty),
                ElementsAre("Internal error: entry #1 in keyword table is invalid; keyword is "
                            "missing."));
}

TEST(KeywordTable, AMinimumIsNoLongerThanItsKeyword) {
    constexpr _KeywordFields fields[] = {{"day", 3}, {"hour", 5}, {nullptr, 0}};
    EXPECT_THAT(errorsOf("A,\"%d\",day", fields),
                ElementsAre("Internal error: entry #2 in keyword table is invalid; minimum field "
                            "size, 5, exceeds length of keyword, 4."));
}

TEST(KeywordTable, HoldsAtMost100Entries) {
    std::vector<_KeywordFields> fields(100, {"day", 2});
    fields.push_back({nullptr, 0});
    EXPECT_TRUE(ParserProbe("A,\"%d\",day", fields.data()).isLearned());
    fields.insert(fields.begin(), {"hour", 2});
    EXPECT_THAT(errorsOf("A,\"%d\",day", fields.data()),
                ElementsAre("Internal error: number of entries in keyword table exceeds maximum of "
                            "100."));
}

TEST(KeywordTable, IsTracedEntryByEntryInFineDetail) {
    constexpr _KeywordFields fields[] = {{"day", 2}, {"hour", 4}, {nullptr, 0}};
    RecordingTrace trace(TRC1_FINE);
    { const ParserProbe parser("A,\"%d\",day", fields); }
    EXPECT_THAT(trace.messages(),
                ElementsAre(" object destroyed.", "Keyword table entry #1 is (da)y.",
                            "Keyword table entry #2 is (hour).", "day object destroyed.",
                            "ANCHOR object destroyed."));
}

} // namespace
