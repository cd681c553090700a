#include "host/http/QueryFields.h"

#include "unit/host/http/RefusalOf.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <functional>
#include <string>

using namespace zrm::host;

namespace {

using testing::ElementsAre;

HttpRequest requestOf(std::multimap<std::string, std::string> query) {
    HttpRequest request;
    request.query = std::move(query);
    return request;
}

std::string refused(std::multimap<std::string, std::string> query,
                    const std::function<void(QueryFields&)>& read) {
    return refusalOf<QueryFields>(requestOf(std::move(query)), read);
}

TEST(QueryFields, ReturnsParametersByType) {
    const HttpRequest request = requestOf({{"log", "/x"},
                                           {"severity", "info"},
                                           {"severity", "minor"},
                                           {"limit", "7"},
                                           {"from", "2026-11-20T07:03:09.412Z"}});
    QueryFields fields(request);
    EXPECT_EQ(fields.text("log"), "/x");
    EXPECT_THAT(fields.texts("severity"), ElementsAre("info", "minor"));
    EXPECT_EQ(fields.number("limit", 1, 7), 7u);
    EXPECT_EQ(fields.time("from"), 1795158189412);
    EXPECT_EQ(fields.text("none"), std::nullopt);
    EXPECT_EQ(fields.number("none", 0, 1), std::nullopt);
    EXPECT_EQ(fields.time("none"), std::nullopt);
    EXPECT_THAT(fields.texts("none"), ElementsAre());
    fields.refuseUnknown();
}

TEST(QueryFields, RefusesInvalidParameters) {
    const auto number = [](QueryFields& fields) { fields.number("n", 1, 9); };
    for (const char* const value :
         {"", "0", "10", "-1", "+5", " 5", "5 ", "5.0", "0x5", "five", "99999999999999999999999"}) {
        EXPECT_EQ(refused({{"n", value}}, number), "n: write a whole number from 1 to 9") << value;
    }
    EXPECT_EQ(refused({{"n", "1"}, {"n", "2"}}, number), "n: the parameter appears more than once");
    EXPECT_EQ(refused({{"t", "soon"}}, [](QueryFields& fields) { fields.time("t"); }),
              "t: 'soon' is not a time; write it like 2026-11-20T07:03:09, followed by Z or +01:00 "
              "unless it is local");
    EXPECT_EQ(refused({{"n", "1"}, {"m", "2"}}, number),
              "m: unknown parameter; the parameters are n");
    EXPECT_EQ(refused({{"x", ""}}, [](QueryFields&) {}), "x: this path takes no parameters");
}

} // namespace
