#include "host/api/ReportResource.h"

#include "host/http/RequestRefused.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm::host;

namespace {

/// Field and detail of the refusal; "accepted" without one.
std::string refused(const std::string& body) {
    try {
        ReportRequest::parse(body);
    } catch (const RequestRefused& refusal) {
        EXPECT_EQ(refusal.refusal().status, 400);
        return refusal.problem().field + ": " + refusal.problem().text();
    }
    return "accepted";
}

TEST(ReportRequest, ReadsLogWindowAndConditions) {
    const ReportRequest report = ReportRequest::parse(
        R"({"log":"/var/log/auth.log","from":"2026-11-20","to":"1261121000000000",)"
        R"("where":["ENTRYSRC starts 'sshd'","ROWNO >= 5"]})");
    EXPECT_EQ(report.log, "/var/log/auth.log");
    EXPECT_EQ(report.from, "1261120000000000");
    EXPECT_EQ(report.to, "1261121000000000");
    ASSERT_EQ(report.conditions.size(), 6u);
    EXPECT_EQ(report.conditions[0].column, "LOGPATH");
    EXPECT_EQ(report.conditions[0].text, "/var/log/");
    EXPECT_EQ(report.conditions[1].column, "LOGNAME");
    EXPECT_EQ(report.conditions[1].text, "auth.log");
    EXPECT_EQ(report.conditions[2].op, INTF_GREATER_OR_EQUAL);
    EXPECT_EQ(report.conditions[2].text, report.from);
    EXPECT_EQ(report.conditions[3].op, INTF_LESS_OR_EQUAL);
    EXPECT_EQ(report.conditions[3].text, report.to);
    EXPECT_EQ(report.conditions[4].op, INTF_STARTS);
    EXPECT_EQ(report.conditions[5].number, 5);
    ASSERT_EQ(report.where.size(), 2u);
    EXPECT_EQ(report.where[1].number, 5);
    EXPECT_EQ(report.limit, 1000u);
}

TEST(ReportRequest, WithoutAnEndGoesUpToTheNewestEntry) {
    const ReportRequest report = ReportRequest::parse(R"({"log":"/a","from":"2026-11-20"})");
    EXPECT_EQ(report.to, "1991231235959999");
    EXPECT_EQ(report.conditions.size(), 4u);
}

TEST(ReportRequest, ReadsTheNamesOfFields) {
    const auto parse = [](const std::string& fields) {
        return ReportRequest::parse(R"({"log":"/a","from":"2026-11-20","fields":)" + fields + '}')
            .fields;
    };
    EXPECT_EQ(parse(R"(["status","*"])"), (std::vector<std::string>{"status", "*"}));
    EXPECT_EQ(parse("[]"), std::vector<std::string>());
    EXPECT_EQ(refused(R"({"log":"/a","from":"2026-11-20","fields":["a","field.b"]})"),
              "fields[1]: 'field.b' begins with 'field.'; write 'b'");
    EXPECT_EQ(refused(R"({"log":"/a","from":"2026-11-20","fields":[""]})"),
              "fields[0]: is not the name of a field; write 1 to 255 bytes, or \"*\" for all "
              "fields");
}

TEST(ReportRequest, ReadsTheLimit) {
    const auto limit = [](const std::string& number) {
        return ReportRequest::parse(R"({"log":"/a","from":"2026-11-20","limit":)" + number + '}')
            .limit;
    };
    EXPECT_EQ(limit("1"), 1u);
    EXPECT_EQ(limit("10000"), 10'000u);
}

TEST(ReportRequest, ReportsTheWrongField) {
    EXPECT_EQ(refused(""), "log: is missing");
    EXPECT_EQ(refused(R"({"log":"auth.log","from":"2026-11-20"})"),
              "log: 'auth.log' is not the absolute path of a file; write the log's path as in the "
              "log configuration, beginning with '/'");
    EXPECT_EQ(refused(R"({"log":"/a"})"), "from: is missing");
    EXPECT_EQ(refused(R"({"log":"/a","from":"soon"})"),
              "from: 'soon' is not a time; write it like 2026-11-20T07:03:09, followed by Z or "
              "+01:00 unless it is local, or as a 16-digit time stamp");
    EXPECT_EQ(refused(R"({"log":"/a","from":"2026-11-20","to":"2026-11-19"})"),
              "to: is before from");
    EXPECT_EQ(
        refused(R"({"log":"/a","from":"2026-11-20","where":["ENTRYSRC = 'a'","x"]})").substr(0, 10),
        "where[1]: ");
    EXPECT_EQ(refused(R"({"log":"/a","from":"2026-11-20","where":"ENTRYSRC = 'a'"})"),
              "where: write a list of at most 100 texts");
    EXPECT_EQ(refused(R"({"log":"/a","from":"2026-11-20","conditions":[]})"),
              "conditions: unknown member; the members are log, from, to, where, limit, "
              "fields");
    EXPECT_EQ(refused(R"({"log":"/a","from":"2026-11-20","limit":10001})").substr(0, 7), "limit: ");
}

} // namespace
