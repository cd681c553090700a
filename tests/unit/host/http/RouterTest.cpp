#include "host/http/Router.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

using namespace zrm::host;

namespace {

using testing::ElementsAre;
using testing::IsEmpty;

class RouterTest : public testing::Test {
protected:
    void add(const std::string& method, const std::string& pattern,
             Router::Access access = Router::TOKEN) {
        router.add(
            method, pattern,
            [name = method + " " + pattern](const HttpRequest&) { return HttpAnswer::json(name); },
            access);
    }
    /// Method and pattern of the handler that answers.
    std::string handler(const std::string& method, const std::string& path) const {
        const Router::Match match = router.match(method, path);
        return match.handler == nullptr ? "none" : (*match.handler)({}).body;
    }

    Router router;
};

TEST_F(RouterTest, FindsByMethodAndPath) {
    add("GET", "/a/b");
    add("POST", "/a/b");
    EXPECT_EQ(handler("GET", "/a/b"), "GET /a/b");
    EXPECT_EQ(handler("HEAD", "/a/b"), "GET /a/b");
    EXPECT_EQ(handler("POST", "/a/b"), "POST /a/b");
    for (const char* const path :
         {"", "/", "/a", "/a/", "/a/b/", "/a/b/c", "a/b", "//a/b", "/A/b"}) {
        const Router::Match match = router.match("GET", path);
        EXPECT_EQ(match.handler, nullptr) << path;
        EXPECT_EQ(match.pattern, "") << path;
        EXPECT_EQ(match.allow, "") << path;
    }
}

TEST_F(RouterTest, NamesTheMethodsOfAPath) {
    add("GET", "/a/{b}");
    add("PUT", "/a/{b}");
    add("DELETE", "/a/{b}");
    add("POST", "/a/x");
    add("GET", "/a/x");
    const Router::Match match = router.match("PATCH", "/a/x");
    EXPECT_EQ(match.handler, nullptr);
    EXPECT_EQ(match.pattern, "/a/{b}");
    EXPECT_EQ(match.allow, "GET, HEAD, PUT, DELETE, POST");
}

TEST_F(RouterTest, CapturesPartsAsTheyAre) {
    add("GET", "/s/{name}/of/{log}");
    EXPECT_THAT(router.match("GET", "/s/a%2Fb/of/c").captures, ElementsAre("a%2Fb", "c"));
    EXPECT_EQ(handler("GET", "/s//of/c"), "none") << "a name is not empty";
    add("GET", "/files/*");
    EXPECT_THAT(router.match("GET", "/files/a/b.js").captures, ElementsAre("a/b.js"));
    EXPECT_THAT(router.match("GET", "/files/").captures, ElementsAre(""));
    EXPECT_EQ(handler("GET", "/files"), "none");
    add("GET", "/");
    EXPECT_THAT(router.match("GET", "/").captures, IsEmpty());
    EXPECT_EQ(handler("GET", "/"), "GET /");
}

TEST_F(RouterTest, LiteralPartsTakePrecedence) {
    add("GET", "/*");
    add("GET", "/events/{id}");
    add("GET", "/events/stream");
    EXPECT_EQ(handler("GET", "/events/stream"), "GET /events/stream");
    EXPECT_EQ(handler("GET", "/events/17"), "GET /events/{id}");
    EXPECT_EQ(handler("GET", "/events/17/x"), "GET /*");
    EXPECT_THAT(router.match("GET", "/events/stream").captures, IsEmpty());
}

TEST_F(RouterTest, KnowsWhoMaySendARequest) {
    add("GET", "/page", Router::PUBLIC);
    add("POST", "/page");
    EXPECT_EQ(router.match("GET", "/page").access, Router::PUBLIC);
    EXPECT_EQ(router.match("POST", "/page").access, Router::TOKEN);
    EXPECT_EQ(router.match("PUT", "/page").access, Router::TOKEN);
    EXPECT_THAT(router.routes(),
                ElementsAre(testing::Pair("GET", "/page"), testing::Pair("POST", "/page")));
}

} // namespace
