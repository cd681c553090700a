#include "host/config/TextTemplate.h"

#include "host/config/ConditionParser.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm::host;

namespace {

using testing::AllOf;
using testing::HasSubstr;
using testing::StartsWith;
using Kind = TextTemplate::Piece::Kind;

const std::vector<std::string> failed = {
    "ENTRYDESC matches 'Failed password for (?P<user>\\S+) from (?P<ip>\\S+)'"};

Result<TextTemplate> parsed(std::string_view text, const std::vector<std::string>& texts = failed) {
    std::vector<Condition> conditions;
    PatternBudget budget;
    for (const std::string& one : texts) {
        conditions.push_back(ConditionParser("RMLOGENT").parse(one, budget).value());
    }
    return TextTemplate::parse(text, conditions);
}

/// The pieces, those that are not literal in angle brackets.
std::string shown(std::string_view text, const std::vector<std::string>& conditions = failed) {
    const auto result = parsed(text, conditions);
    if (!result) {
        return "refused: " + result.error().text();
    }
    std::string all;
    for (const auto& [kind, part] : result->pieces()) {
        static const char* const names[] = {"", "", "count", "first", "last", "log", "situation"};
        all += kind == Kind::literal ? part
               : kind == Kind::value ? '<' + part + '>'
                                     : '<' + std::string(names[static_cast<int>(kind)]) + '>';
    }
    return all;
}

std::string ignored(std::string_view text) {
    const auto result = parsed(text);
    return result && !result->hasPlaces() ? result->ignored().text() : "has places or is refused";
}

TEST(TextTemplate, HasPlacesForWhatTheSituationKnows) {
    EXPECT_EQ(shown("{count} failed logins of {user} from {ip} on {ENTRYSYS}"),
              "<count> failed logins of <user> from <ip> on <ENTRYSYS>");
    EXPECT_EQ(shown("{first}{last}{log}{situation}{field.x}{entrysrc}"),
              "<first><last><log><situation><field.x><entrysrc>");
}

TEST(TextTemplate, LeavesTextsWithoutNamesAlone) {
    for (const char* const text : {"", "Repeated failures", "100 % }", "}}{"}) {
        EXPECT_FALSE(parsed(text)->hasPlaces()) << text;
    }
    EXPECT_EQ(ignored("no braces"), "");
    EXPECT_EQ(ignored("{{count}}"), "");
}

TEST(TextTemplate, WritesBracesThatAreDoubled) {
    EXPECT_EQ(shown("{{{ip}}} {{x}} {{"), "{<ip>} {x} {");
    EXPECT_EQ(shown("}{ip}}"), "}<ip>}");
}

TEST(TextTemplate, RefusesWhatIsWrongBesideAKnownName) {
    EXPECT_THAT(shown("{count} from {adress}"),
                AllOf(StartsWith("refused: {adress}: 'adress' is not a name of this situation"),
                      HasSubstr("the names are user, ip, ORIGINNODE"),
                      HasSubstr("count, first, last, log and situation; write {{ for a brace")));
    EXPECT_THAT(shown("{ip} {"), HasSubstr("has a '{' without a '}'"));
    EXPECT_THAT(shown("{ip} {a{b}"), HasSubstr("has a '{' without a '}'"));
    EXPECT_THAT(shown("{ip} {}"), HasSubstr("'' is not a name"));
    EXPECT_THAT(shown("{ip} { ip }"), HasSubstr("' ip ' is not a name"));
}

TEST(TextTemplate, KeepsATextWhoseNamesAreAllUnknown) {
    EXPECT_THAT(ignored("see {wiki}/ssh"), StartsWith("{wiki}: 'wiki' is not a name"));
    EXPECT_THAT(ignored("{ never ended"), HasSubstr("without a '}'"));
}

TEST(TextTemplate, PrefersACaptureToWhatAllEventsHave) {
    EXPECT_EQ(shown("{count}", {"ENTRYDESC matches '(?P<count>\\d+) errors'"}), "<count>");
    const auto result = parsed("{count}{log}", {"ENTRYDESC matches '(?P<count>\\d+) errors'"});
    EXPECT_EQ(result->pieces()[0].kind, Kind::value);
    EXPECT_EQ(result->pieces()[1].kind, Kind::log);
    // A field that a condition names has no precedence.
    EXPECT_EQ(parsed("{count}", {"field.count > 1"})->pieces()[0].kind, Kind::count);
}

} // namespace
