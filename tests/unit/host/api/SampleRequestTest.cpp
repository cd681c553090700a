#include "host/api/SampleResource.h"

#include "host/http/RequestRefused.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm::host;
using testing::HasSubstr;
using testing::StartsWith;

namespace {

std::string refused(const std::string& body, const char* table = "RMMONLOG") {
    try {
        SampleRequest::parse(table, body);
    } catch (const RequestRefused& refusal) {
        EXPECT_EQ(refusal.refusal().status, 400);
        return refusal.problem().field + ": " + refusal.problem().text();
    }
    return "accepted";
}

std::string filter(const std::string& inner) {
    return R"({"filters":[{)" + inner + "}]}";
}

TEST(SampleRequest, ReadsFilters) {
    const std::vector<Condition> conditions = SampleRequest::parse(
        "RMMONLOG", R"({"filters":[{"column":"LOGNAME","op":"starts","value":"auth"},
                                   {"column":"LOGSIZE","op":">=","value":5},
                                   {"column":"LOGTYPE","op":"in","value":["S","U"]},
                                   {"column":"MONTIME","op":"<","value":"2026-11-20T07:03:09"}]})");
    ASSERT_EQ(conditions.size(), 4u);
    EXPECT_EQ(conditions[0].op, INTF_STARTS);
    EXPECT_EQ(conditions[0].text, "auth");
    EXPECT_EQ(conditions[1].number, 5);
    EXPECT_EQ(conditions[2].values, (std::vector<std::string>{"S", "U"}));
    EXPECT_EQ(conditions[3].text, "1261120070309000");
}

TEST(SampleRequest, NeedsNoFiltersForTheMonitoredLogs) {
    EXPECT_EQ(refused(""), "accepted");
    EXPECT_EQ(refused("{}"), "accepted");
    EXPECT_EQ(refused(R"({"filters":[]})"), "accepted");
    EXPECT_EQ(refused(R"({"filters":null})"), "accepted");
}

TEST(SampleRequest, NamesWhatJudgesFields) {
    const std::string refusal =
        refused(filter(R"("column":"field.status","op":"=","value":"500")"), "RMLOGENT");
    EXPECT_THAT(refusal, StartsWith("filters[0].column: the rows of a sample have no fields; "));
    EXPECT_THAT(refusal, HasSubstr("zrmctl report"));
    EXPECT_THAT(refusal, HasSubstr("zrmctl explain"));
}

TEST(SampleRequest, RefusesInvalidBodies) {
    EXPECT_EQ(refused("{"), "body: the body is not JSON");
    EXPECT_EQ(refused("{\"filters\":\"\xff\"}"), "body: the body is not JSON");
    EXPECT_EQ(refused("[]"), "body: write an object");
    EXPECT_EQ(refused("5"), "body: write an object");
    EXPECT_EQ(refused(R"({"filter":[]})"), "filter: unknown member; the members are filters");
    EXPECT_EQ(refused(R"({"filters":{}})"), "filters: write a list of at most 100 filters");
    EXPECT_EQ(refused(R"({"filters":"x"})"), "filters: write a list of at most 100 filters");
    EXPECT_EQ(refused(R"({"filters":[],"filters":[]})"), "filters: the member appears twice");
    EXPECT_EQ(refused(std::string(100'000, '[')), "body: the body is nested deeper than 32");
    std::string many = R"({"filters":[0)";
    for (int count = 0; count < 100; ++count) {
        many += ",0";
    }
    EXPECT_EQ(refused(many + "]}"), "filters: write a list of at most 100 filters");
}

TEST(SampleRequest, NamesTheWrongFilter) {
    EXPECT_EQ(refused(R"({"filters":["x"]})"),
              "filters[0]: write an object with column, op and value");
    EXPECT_EQ(refused(filter(R"("op":"=","value":"a")")), "filters[0].column: write a text");
    EXPECT_EQ(refused(filter(R"("column":5,"op":"=","value":"a")")),
              "filters[0].column: write a text");
    EXPECT_EQ(refused(filter(R"("column":"LOGNAME","value":"a")")), "filters[0].op: write a text");
    EXPECT_EQ(refused(filter(R"("column":"LOGNAME","op":"=")")), "filters[0].value: is missing");
    EXPECT_EQ(refused(filter(R"("column":"LOGNAME","op":"=","value":"a","not":true)")),
              "filters[0].not: unknown member; a filter has column, op and value");
    EXPECT_EQ(refused(R"({"filters":[{"column":"LOGNAME","op":"=","value":"a"},
                                     {"column":"LOGNAME","op":"is","value":"a"}]})"),
              "filters[1].op: 'is' is not an operator; the operators are =, !=, >=, <=, <, >, "
              "contains, starts, matches, in");
}

TEST(SampleRequest, RefusesUnusableValues) {
    const auto value = [](const std::string& column, const std::string& op,
                          const std::string& json) {
        return refused(
            filter("\"column\":\"" + column + "\",\"op\":\"" + op + "\",\"value\":" + json));
    };
    const std::string form = "filters[0].value: write a text, a whole number, or a list of them";
    EXPECT_EQ(value("LOGNAME", "=", "null"), form);
    EXPECT_EQ(value("LOGNAME", "=", "true"), form);
    EXPECT_EQ(value("LOGSIZE", "=", "1.5"), form);
    EXPECT_EQ(value("LOGNAME", "in", "[[\"a\"]]"), form);
    EXPECT_EQ(value("LOGNAME", "=", "5"),
              "filters[0].value: LOGNAME holds text; write the value in quotes");
    EXPECT_EQ(value("LOGSIZE", "=", "18446744073709551615"),
              "filters[0].value: the number does not fit the column; write a number from "
              "-2147483648 to 2147483647");
    EXPECT_EQ(value("MONTIME", ">=", "\"soon\""),
              "filters[0].value: 'soon' is not a time; write it like '2026-11-20T07:03:09', "
              "followed by Z or +01:00 unless it is local, or as a 16-digit time stamp");
    EXPECT_EQ(value("COLOUR", "=", "\"red\"").substr(0, 47),
              "filters[0].column: 'COLOUR' is not a column; th");
}

TEST(SampleRequest, RegularExpressionsAreLimitedTogether) {
    std::string filters;
    for (int count = 0; count < 3; ++count) {
        filters += filters.empty() ? "" : ",";
        filters += R"({"column":"LOGNAME","op":"matches","value":"\\pL{8}"})";
    }
    const std::string problem = refused(R"({"filters":[)" + filters + "]}");
    EXPECT_TRUE(problem.starts_with(
        "filters[2].value: together with this one the regular expressions are too large; "))
        << problem;
}

TEST(SampleRequest, AReportNeedsALogAndAWindow) {
    const std::string path = R"({"column":"LOGPATH","op":"=","value":"/var/log/"})";
    const std::string name = R"({"column":"LOGNAME","op":"=","value":"auth.log"})";
    const std::string start = R"({"column":"ENTRYTIME","op":">=","value":"2026-11-20"})";
    const std::string end = R"({"column":"ENTRYTIME","op":"<=","value":"2026-11-21"})";
    const auto report = [](const std::string& filters) {
        return refused("{\"filters\":[" + filters + "]}", "RMLOGENT");
    };
    EXPECT_EQ(report(path + "," + name + "," + start + "," + end), "accepted");
    EXPECT_EQ(report(R"({"column":"ULOGPATH","op":"=","value":"/"},)"
                     R"({"column":"ULOGNAME","op":"=","value":"a"},)" +
                     start + "," + end),
              "accepted");
    EXPECT_EQ(report(name + "," + start + "," + end),
              "filters: name the log's directory: LOGPATH or ULOGPATH with =");
    EXPECT_EQ(report(path + "," + start + "," + end),
              "filters: name the log: LOGNAME or ULOGNAME with =");
    const std::string window = "filters: give the time window: ENTRYTIME with >= and with <=";
    EXPECT_EQ(report(path + "," + name), window);
    EXPECT_EQ(report(path + "," + name + "," + start), window);
    EXPECT_EQ(report(path + "," + name + "," + end), window);
    EXPECT_EQ(refused("", "RMLOGENT"),
              "filters: name the log's directory: LOGPATH or ULOGPATH with =");
}

} // namespace
