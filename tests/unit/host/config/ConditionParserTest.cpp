#include "host/config/ConditionParser.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>

#include "support/ReasonOf.h"

using namespace zrm::host;

namespace {

using testing::ElementsAre;

Condition parsed(const std::string& text, const char* table = "RMLOGENT") {
    const auto result = ConditionParser(table).parse(text);
    if (!result) {
        ADD_FAILURE() << text << ": " << reasonOf(result);
        return {};
    }
    return *result;
}

Problem problem(const std::string& text, const char* table = "RMLOGENT") {
    const auto result = ConditionParser(table).parse(text);
    return result ? Problem{"accepted"} : result.error();
}

std::string refused(const std::string& text, const char* table = "RMLOGENT") {
    const auto result = ConditionParser(table).parse(text);
    return result ? "accepted" : reasonOf(result);
}

TEST(ConditionParser, ReadsEveryOperatorOnText) {
    const std::pair<const char*, int> operators[] = {
        {"=", 1}, {"!=", 2},         {">=", 3},       {"<=", 4},        {"<", 5},
        {">", 6}, {"contains", 101}, {"starts", 102}, {"matches", 103},
    };
    for (const auto& [name, code] : operators) {
        const Condition condition = parsed("ENTRYSRC " + std::string(name) + " 'sshd'");
        EXPECT_EQ(condition.column, "ENTRYSRC");
        EXPECT_EQ(condition.op, code) << name;
        EXPECT_EQ(condition.text, "sshd");
        EXPECT_FALSE(condition.isNumber);
    }
}

TEST(ConditionParser, ReadsNumbers) {
    const Condition condition = parsed("LOGSIZE >= -12", "RMMONLOG");
    EXPECT_EQ(condition.op, INTF_GREATER_OR_EQUAL);
    EXPECT_TRUE(condition.isNumber);
    EXPECT_EQ(condition.number, -12);
}

TEST(ConditionParser, BlanksAreOptional) {
    EXPECT_EQ(parsed("ENTRYSRC='a'").text, "a");
    EXPECT_EQ(parsed(" \t ENTRYSRC \t contains'a b' \t").text, "a b");
    EXPECT_EQ(parsed("LOGSIZE<5", "RMMONLOG").number, 5);
}

TEST(ConditionParser, TwoQuotesMeanOneAndABackslashIsLiteral) {
    EXPECT_EQ(parsed("ENTRYDESC contains 'it''s'").text, "it's");
    EXPECT_EQ(parsed("ENTRYDESC = ''''").text, "'");
    EXPECT_EQ(parsed("ENTRYDESC = ''").text, "");
    EXPECT_EQ(parsed("ENTRYDESC matches '\\d+ \"x\"'").text, "\\d+ \"x\"");
}

TEST(ConditionParser, ReadsLists) {
    const Condition texts = parsed("ENTRYTYPE in ['E','W' , 'it''s, or ]']");
    EXPECT_EQ(texts.op, INTF_IN);
    EXPECT_THAT(texts.values, ElementsAre("E", "W", "it's, or ]"));
    const Condition numbers = parsed("NUMERRORS in [1, -2]", "RMMONLOG");
    EXPECT_TRUE(numbers.isNumber);
    EXPECT_THAT(numbers.values, ElementsAre("1", "-2"));
}

TEST(ConditionParser, ReadsFields) {
    const Condition text = parsed("field.user = 'root'");
    EXPECT_EQ(text.column, "field.user");
    EXPECT_EQ(text.text, "root");
    EXPECT_FALSE(text.isNumber);
    const Condition number = parsed("field.request_time>1.5");
    EXPECT_EQ(number.column, "field.request_time");
    EXPECT_EQ(number.op, INTF_GREATER);
    EXPECT_EQ(number.text, "1.5");
    EXPECT_EQ(parsed("field.bytes > 1e5"), parsed("field.bytes > 1e+05"));
    EXPECT_TRUE(number.isNumber);
    EXPECT_EQ(parsed("field.status != -7").text, "-7");
    EXPECT_EQ(parsed("field.big < 1e300").text, "1e+300");
    EXPECT_EQ(parsed("field.user matches '^r'").op, INTF_MATCHES);
    const Condition list = parsed("field.status in [500, 502.5]");
    EXPECT_TRUE(list.isNumber);
    EXPECT_THAT(list.values, ElementsAre("500", "502.5"));
    EXPECT_THAT(parsed("field.user in ['a', '7']").values, ElementsAre("a", "7"));
}

TEST(ConditionParser, NamesOfFieldsAreAnyText) {
    EXPECT_EQ(parsed("field.origin@32473.ip = ''").column, "field.origin@32473.ip");
    EXPECT_EQ(parsed("field.a/b[0]:c\xc3\xbc contains 'x'").column, "field.a/b[0]:c\xc3\xbc");
    EXPECT_EQ(parsed("field.'an odd ''name'' =1' = 2").column, "field.an odd 'name' =1");
}

TEST(ConditionParser, RefusesWhatAFieldCannotBeComparedWith) {
    EXPECT_EQ(problem("field. = 1").field, "column");
    EXPECT_EQ(problem("field.'' = 1").field, "column");
    EXPECT_EQ(problem("field.'open = 1").field, "value");
    EXPECT_EQ(problem("field." + std::string(256, 'x') + " = 1").field, "column");
    EXPECT_EQ(problem("field.x is 1").field, "op");
    EXPECT_EQ(problem("field.x contains 5").what, "'contains' compares text");
    EXPECT_EQ(problem("field.x in ['a', 5]").what, "the list has texts and numbers");
    EXPECT_EQ(problem("field.x in [5, 'a']").what, "the list has texts and numbers");
    EXPECT_EQ(problem("field.x in []").what, "the list has 0 values");
    EXPECT_EQ(problem("field.x = [1]").field, "value");
    EXPECT_EQ(problem("field.x > abc").field, "value");
    EXPECT_EQ(problem("field.x > inf").field, "value");
    EXPECT_EQ(problem("field.x matches '('").field, "value");
    EXPECT_EQ(problem("field.x = '" + std::string(4097, 'x') + "'").field, "value");
    EXPECT_EQ(problem("FIELD.x = 1").field, "column");
    EXPECT_EQ(problem("field.x = 1", "RMMONLOG").field, "column");
}

TEST(ConditionParser, TimesBecomeTimeStamps) {
    EXPECT_EQ(parsed("ENTRYTIME >= '2026-11-20T07:03:09'").text, "1261120070309000");
    EXPECT_EQ(parsed("ENTRYTIME >= '1261120070309000'").text, "1261120070309000");
    EXPECT_THAT(parsed("ENTRYTIME in ['2026-11-20', '']").values,
                ElementsAre("1261120000000000", ""));
    EXPECT_EQ(parsed("ENTRYTIME starts '12611'").text, "12611");
    EXPECT_EQ(refused("ENTRYTIME >= 'yesterday'"),
              "'yesterday' is not a time; write it like '2026-11-20T07:03:09', followed by Z or "
              "+01:00 unless it is local, or as a 16-digit time stamp");
}

TEST(ConditionParser, RefusesUnknownColumns) {
    EXPECT_EQ(refused("ENTRYSOURCE = 'a'"),
              "'ENTRYSOURCE' is not a column; the columns are ORIGINNODE, LOGPATH, LOGNAME, "
              "ENTRYTIME, ENTRYSYS, ENTRYSRC, ENTRYTYPE, ENTRYCLASS, ENTRYDESC, FREQTHRESH, "
              "PERIODTHRS, TIMESTAMP, SAMPLENO, ROWNO, ULOGPATH, ULOGNAME, UENTRYSRC, "
              "UENTRYDESC, and field.NAME for the fields of entries");
    EXPECT_EQ(refused("entrysrc = 'a'"),
              "'entrysrc' is not a column; write it in upper case: ENTRYSRC");
    // The columns of one table are not those of the other.
    EXPECT_THAT(refused("MONSTATUS = 'a'"), testing::StartsWith("'MONSTATUS' is not a column; "));
    EXPECT_EQ(parsed("MONSTATUS = 'Running'", "RMMONLOG").text, "Running");
}

TEST(ConditionParser, RefusesUnknownOperators) {
    const std::string cure = "the operators are =, !=, >=, <=, <, >, contains, starts, matches, in";
    EXPECT_EQ(refused("ENTRYSRC == 'a'"), "'==' is not an operator; " + cure);
    EXPECT_EQ(refused("ENTRYSRC like 'a'"), "'like' is not an operator; " + cure);
    EXPECT_EQ(refused("ENTRYSRC is sshd"), "'is' is not an operator; " + cure);
    EXPECT_EQ(refused("LOGSIZE contains 5", "RMMONLOG"),
              "LOGSIZE holds numbers and 'contains' compares text; use =, !=, >=, <=, <, > or in");
}

TEST(ConditionParser, RefusesIncompleteConditions) {
    const std::string form = "write COLUMN OP VALUE, for example ENTRYDESC contains 'failed'";
    EXPECT_EQ(refused(""), "the column is missing; " + form);
    EXPECT_EQ(refused("= 'a'"), "the column is missing; " + form);
    EXPECT_EQ(refused("ENTRYSRC"), "the operator is missing; " + form);
    EXPECT_EQ(refused("ENTRYSRC ="), "the value is missing; " + form);
    EXPECT_EQ(refused("ENTRYSRC in ['a',]"), "the value is missing; " + form);
}

TEST(ConditionParser, RefusesMalformedValues) {
    EXPECT_EQ(refused("ENTRYSRC = 'a"), "the text has no closing quote; end it with '");
    EXPECT_EQ(refused("ENTRYSRC = 'a''"), "the text has no closing quote; end it with '");
    EXPECT_EQ(refused("ENTRYSRC = sshd"),
              "'sshd' is not a value; write text in single quotes and numbers without");
    EXPECT_EQ(refused("LOGSIZE = 5k", "RMMONLOG"),
              "'5k' is not a value; write text in single quotes and numbers without");
    EXPECT_EQ(refused("LOGSIZE = 99999999999999999999", "RMMONLOG"),
              "LOGSIZE holds numbers; write the value as a whole number without quotes");
    EXPECT_EQ(refused("ENTRYSRC in ['a' 'b']"), "the list has no end; end it with ]");
    EXPECT_EQ(refused("ENTRYSRC in ['a'"), "the list has no end; end it with ]");
    EXPECT_EQ(refused("ENTRYSRC = 'a' and ENTRYDESC = 'b'"),
              "'and ENTRYDESC = 'b'' follows the value; write one condition per text");
}

TEST(ConditionParser, RefusesValuesOfTheOtherKind) {
    EXPECT_EQ(refused("ENTRYSRC = 5"), "ENTRYSRC holds text; write the value in quotes");
    EXPECT_EQ(refused("ENTRYSRC in ['a', 5]"), "ENTRYSRC holds text; write the value in quotes");
    EXPECT_EQ(refused("LOGSIZE = '5'", "RMMONLOG"),
              "LOGSIZE holds numbers; write the value as a whole number without quotes");
    EXPECT_EQ(refused("ENTRYSRC = ['a']"), "'=' takes one value; use in for a list");
    EXPECT_EQ(refused("ENTRYSRC in 'a'"), "in takes a list; write the values in brackets");
    EXPECT_EQ(refused("ENTRYSRC in []"), "the list has 0 values; write 1 to 1000 values");
}

TEST(ConditionParser, RefusesValuesThatTheColumnCannotHold) {
    EXPECT_EQ(refused("ENTRYTYPE = '12345678901234567'"),
              "the value has 17 bytes and ENTRYTYPE holds 16; shorten the value, or use starts");
    EXPECT_EQ(parsed("ENTRYTYPE = '1234567890123456'").text, "1234567890123456");
    EXPECT_EQ(refused("LOGSIZE = 2147483648", "RMMONLOG"),
              "the number does not fit the column; write a number from -2147483648 to 2147483647");
}

TEST(ConditionParser, RefusesListsThatCannotBePassedOn) {
    EXPECT_EQ(refused("ENTRYSRC in ['a\nb']"),
              "a value of the list has a line end; no column can contain one: remove it");
    std::string list = "UENTRYDESC in [";
    for (int count = 0; count < 22; ++count) {
        list += (count == 0 ? "'" : ", '") + std::string(768, 'a') + "'";
    }
    EXPECT_EQ(refused(list + "]"), "the list has 16918 bytes; write at most 16384");
}

TEST(ConditionParser, RefusesPatternsThatCannotBeUsed) {
    EXPECT_EQ(refused("ENTRYDESC matches '(a'"),
              "'(a' is not a regular expression: missing ): (a; correct it (RE2 syntax)");
    EXPECT_EQ(refused("ENTRYDESC contains ''"), "the value has 0 bytes; write 1 to 4096 bytes");
    EXPECT_EQ(refused("ENTRYDESC starts '" + std::string(4097, 'a') + "'"),
              "the value has 4097 bytes; write 1 to 4096 bytes");
}

TEST(ConditionParser, ALogBecomesItsDirectoryAndItsName) {
    const auto of = [](const std::string& path) {
        std::string text;
        const auto result = ConditionBuilder::ofLog(path);
        if (!result) {
            return reasonOf(result);
        }
        for (const Condition& condition : *result) {
            EXPECT_EQ(condition.op, INTF_EQUAL);
            text += condition.column + "=" + condition.text + " ";
        }
        return text;
    };
    EXPECT_EQ(of("/var/log/auth.log"), "LOGPATH=/var/log/ LOGNAME=auth.log ");
    EXPECT_EQ(of("/messages"), "LOGPATH=/ LOGNAME=messages ");
    EXPECT_EQ(of("/var/l\xc3\xb6g/auth.log"), "ULOGPATH=/var/l\xc3\xb6g/ ULOGNAME=auth.log ");
    const std::string longName(129, 'n');
    EXPECT_EQ(of("/var/" + longName), "LOGPATH=/var/ ULOGNAME=" + longName + " ");
    const std::string cure = "write the log's path as in the log configuration, beginning with '/'";
    EXPECT_EQ(of("auth.log"), "'auth.log' is not the absolute path of a file; " + cure);
    EXPECT_EQ(of(""), "'' is not the absolute path of a file; " + cure);
    EXPECT_EQ(of("/var/log/"), "'/var/log/' is not the absolute path of a file; " + cure);
    EXPECT_EQ(of("/" + std::string(385, 'n')), "the path is too long for a log's path; shorten it");
}

} // namespace
