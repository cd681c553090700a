#include "host/console/ConsoleResource.h"

#include "unit/host/http/TestRouter.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <regex>
#include <string>
#include <utility>
#include <vector>

using namespace zrm::host;

namespace {

using testing::Contains;
using testing::Pair;
using testing::StartsWith;

class ConsoleResourceTest : public testing::Test {
protected:
    ConsoleResource resource;
    TestRouter router{resource};
};

TEST_F(ConsoleResourceTest, ServesThePage) {
    const HttpAnswer answer = router.ask("GET", "/");
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.contentType, "text/html; charset=utf-8");
    EXPECT_THAT(answer.body, StartsWith("<!doctype html>"));
    EXPECT_EQ(answer.body, ConsoleFile::find("index.html")->content);
}

TEST_F(ConsoleResourceTest, SendsTheContentTypeOfEachFile) {
    const std::vector<std::pair<std::string, std::string>> files = {
        {"index.html", "text/html; charset=utf-8"},
        {"style/base.css", "text/css; charset=utf-8"},
        {"main.js", "text/javascript; charset=utf-8"},
        {"views/logs.js", "text/javascript; charset=utf-8"},
        {"chart.js", "text/javascript; charset=utf-8"},
        {"icon.svg", "image/svg+xml"},
    };
    for (const auto& [name, type] : files) {
        const HttpAnswer answer = router.ask("GET", "/console/" + name);
        EXPECT_EQ(answer.status, 200) << name;
        EXPECT_EQ(answer.contentType, type) << name;
        EXPECT_FALSE(answer.body.empty()) << name;
    }
}

TEST_F(ConsoleResourceTest, AllowsOnlyItsOwnScripts) {
    for (const char* const path : {"/", "/console/main.js", "/console/icon.svg"}) {
        const HttpAnswer answer = router.ask("GET", path);
        EXPECT_THAT(answer.headers,
                    Contains(Pair(
                        "Content-Security-Policy",
                        "default-src 'none'; script-src 'self'; style-src 'self'; img-src 'self'; "
                        "connect-src 'self'; base-uri 'none'; form-action 'none'; "
                        "frame-ancestors 'none'")))
            << path;
        EXPECT_THAT(answer.headers, Contains(Pair("Referrer-Policy", "no-referrer"))) << path;
        EXPECT_THAT(answer.headers, Contains(Pair("Cross-Origin-Opener-Policy", "same-origin")));
        EXPECT_THAT(answer.headers, Contains(Pair("Cache-Control", "no-cache"))) << path;
    }
}

TEST_F(ConsoleResourceTest, RefusesUnknownFiles) {
    for (const char* const path :
         {"/console/none.js", "/console/views", "/console/views/", "/console/../main.js",
          "/console//main.js", "/console/Main.js", "/console/main.js/"}) {
        const HttpAnswer answer = router.ask("GET", path);
        EXPECT_EQ(answer.status, 404) << path;
        EXPECT_EQ(answer.body, ": the console has no such file") << path;
    }
}

TEST_F(ConsoleResourceTest, NeedsNoToken) {
    Router routes;
    resource.addRoutes(routes);
    for (const char* const path : {"/", "/console/main.js"}) {
        const Router::Match match = routes.match("GET", path);
        ASSERT_NE(match.handler, nullptr) << path;
        EXPECT_EQ(match.access, Router::PUBLIC) << path;
        EXPECT_EQ(routes.match("POST", path).handler, nullptr) << path;
    }
}

TEST_F(ConsoleResourceTest, HasEveryFileThatThePageNames) {
    const std::string page = router.ask("GET", "/").body;
    const std::regex named("(?:src|href)=\"/?(console/[^\"]+)\"");
    int count = 0;
    for (auto at = std::sregex_iterator(page.begin(), page.end(), named);
         at != std::sregex_iterator(); ++at, ++count) {
        EXPECT_EQ(router.ask("GET", "/" + (*at)[1].str()).status, 200) << (*at)[1];
    }
    EXPECT_GE(count, 3); // style, script, icon
}

} // namespace
