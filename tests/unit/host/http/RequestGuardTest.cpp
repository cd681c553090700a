#include "host/http/RequestGuard.h"

#include <gtest/gtest.h>

#include <string>

using namespace zrm::host;

namespace {

const std::string secret(64, 'a');

class RequestGuardTest : public testing::Test {
protected:
    int status(const RequestGuard::Headers& headers, bool isPublic = false) const {
        const auto allowed = guard.check(headers, isPublic);
        return allowed ? 200 : allowed.error().status;
    }
    int hostStatus(const std::string& host) const { return status({host, {}, bearer}); }
    int originStatus(const std::string& origin) const {
        return status({"localhost:7186", origin, bearer});
    }

    const std::string bearer = "Bearer " + secret;
    RequestGuard guard{{"127.0.0.1", 7186}, ApiToken(secret)};
};

TEST_F(RequestGuardTest, TheHostIsTheListenAddressOrLocalhost) {
    for (const char* const host :
         {"127.0.0.1:7186", "localhost:7186", "LocalHost:7186", "[::1]:7186"}) {
        EXPECT_EQ(hostStatus(host), 200) << host;
    }
    for (const char* const host :
         {"", "localhost", "127.0.0.1", "localhost:80", "evil.example:7186", "localhost.evil:7186",
          "127.0.0.1:7186.evil", "127.0.0.2:7186", "localhost:7186 "}) {
        EXPECT_EQ(hostStatus(host), 421) << host;
    }
    EXPECT_EQ(status({{}, {}, bearer}), 421) << "no Host header";
    EXPECT_EQ(status({"evil.example:7186", {}, {}}, true), 421) << "public paths too";
}

TEST_F(RequestGuardTest, TheDefaultPortIsOptional) {
    const RequestGuard usual({"127.0.0.1", 80}, ApiToken(secret));
    EXPECT_TRUE(usual.check({"localhost", {}, bearer}, false));
    EXPECT_TRUE(usual.check({"localhost:80", {}, bearer}, false));
    EXPECT_TRUE(usual.check({"[::1]", {}, bearer}, false));
}

TEST_F(RequestGuardTest, ForeignOriginsAreRefused) {
    EXPECT_EQ(originStatus("http://localhost:7186"), 200);
    EXPECT_EQ(originStatus("http://127.0.0.1:7186"), 200);
    for (const char* const origin :
         {"null", "", "http://evil.example", "http://localhost", "https://localhost:7186",
          "http://localhost:7187", "http://localhost:7186.evil.example"}) {
        EXPECT_EQ(originStatus(origin), 403) << origin;
    }
}

TEST_F(RequestGuardTest, EverythingElseNeedsTheToken) {
    const auto with = [&](const std::optional<std::string>& authorization) {
        return status({"localhost:7186", {}, authorization});
    };
    EXPECT_EQ(with("Bearer " + secret), 200);
    EXPECT_EQ(with("bearer " + secret), 200);
    for (const std::string& wrong :
         {std::string(), std::string("Bearer"), std::string("Bearer "), secret, "Basic " + secret,
          "Bearer " + secret.substr(1), "Bearer  " + secret, "Bearer " + secret + "a"}) {
        EXPECT_EQ(with(wrong), 401) << wrong;
    }
    EXPECT_EQ(with(std::nullopt), 401);
    EXPECT_EQ(status({"localhost:7186", {}, {}}, true), 200);
}

TEST_F(RequestGuardTest, ReportsWhatIsMissing) {
    const auto allowed = guard.check({"localhost:7186", {}, {}}, false);
    ASSERT_FALSE(allowed);
    EXPECT_EQ(allowed.error().json(),
              R"({"type":"about:blank","title":"Unauthorized","status":401,)"
              R"("detail":"send the API token: Authorization: Bearer TOKEN",)"
              R"("field":"Authorization"})");
}

} // namespace
