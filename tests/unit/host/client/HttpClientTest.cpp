#include "host/client/HttpClient.h"

#include "../sinks/ScriptedServer.h"

#include <gtest/gtest.h>

#include <chrono>
#include <cstdlib>
#include <string>

#include <fcntl.h>
#include <sys/resource.h>
#include <sys/select.h>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;
using Outcome = HttpClientAnswer::Outcome;
using Reply = ScriptedServer::Reply;

constexpr HttpLimits quick{.connect = 10s, .head = 400ms, .whole = 400ms};
constexpr HttpLimits patient{.connect = 60s, .head = 60s, .whole = 60s};

long mostMemory() { ///< kilobytes
    rusage usage{};
    getrusage(RUSAGE_SELF, &usage);
    return usage.ru_maxrss;
}

class HttpClientTest : public testing::Test {
protected:
    HttpClientAnswer ask(Reply reply, const HttpLimits& limits) {
        const ScriptedServer server([&](const ScriptedServer::Request&) { return reply; });
        HttpClient client(
            {{.isSecure = false, .host = "127.0.0.1", .port = server.port(), .target = "/"},
             "",
             "",
             "test"});
        return client.send({.method = "GET",
                            .target = "/x",
                            .limits = limits,
                            .receive =
                                [this](int, std::string_view piece) {
                                    received += piece.size();
                                    return received < most;
                                }},
                           giveUp.get_token());
    }

    /// Nothing of an answer without end is kept.
    HttpClientAnswer askEndless(const std::string& begin, const std::string& endless,
                                const HttpLimits& limits) {
        const long before = mostMemory();
        HttpClientAnswer answer = ask({begin, Reply::KEEP, endless}, limits);
        EXPECT_LT(mostMemory() - before, 32 * 1024); // the sanitizers' own memory included
        return answer;
    }

    std::stop_source giveUp;
    std::size_t received = 0;
    std::size_t most = 1 << 20;
};

} // namespace

TEST_F(HttpClientTest, AnEndlessHeadIsRefused) {
    const std::string large(10'000, 'x');
    for (const auto& [begin, endless] : std::initializer_list<std::pair<const char*, std::string>>{
             {"HTTP/1.1 200 ", large},
             {"HTTP/1.1 200 OK\r\nX-One: ", large},
             {"HTTP/1.1 200 OK\r\n", "X-One: 1\r\n"},
             {"", "HTTP/1.1 103 Early Hints\r\n\r\n"}}) {
        const HttpClientAnswer answer = askEndless(begin, endless, patient);
        EXPECT_EQ(answer.status, 0) << begin;
        EXPECT_NE(answer.outcome, Outcome::late) << begin;
        EXPECT_NE(answer.outcome, Outcome::whole) << begin;
    }
}

TEST_F(HttpClientTest, EndlessTrailersAreRefused) {
    const HttpClientAnswer answer = askEndless(
        "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n0\r\n", "X-One: 1\r\n", patient);
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.outcome, Outcome::partial);
}

TEST_F(HttpClientTest, AnEndlessChunkSizeTakesNoMemoryAndEndsInTime) {
    const HttpClientAnswer answer =
        askEndless("HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n1;", "extension", quick);
    EXPECT_EQ(answer.outcome, Outcome::partial);
    EXPECT_EQ(received, 0u);
}

TEST_F(HttpClientTest, ABodyIsReadUntilItsReceiverHasEnough) {
    const HttpClientAnswer answer = askEndless("HTTP/1.1 200 OK\r\n\r\n", "body", patient);
    EXPECT_EQ(answer.outcome, Outcome::partial);
    EXPECT_GE(received, most);
    EXPECT_LT(received, most + 65536);
}

TEST_F(HttpClientTest, AServerThatSendsAByteNowAndThenIsGivenUpInTime) {
    const Clock::time_point begin = Clock::now();
    EXPECT_EQ(ask({"HTTP/1.1 200 OK\r\nX: ", Reply::KEEP, "x", 10ms}, quick).outcome,
              Outcome::late);
    EXPECT_EQ(ask({"HTTP/1.1 200 OK\r\n\r\n", Reply::KEEP, "x", 10ms}, quick).outcome,
              Outcome::partial);
    EXPECT_LT(Clock::now() - begin, 20s);
}

TEST_F(HttpClientTest, AStreamMayLastButNotStaySilent) {
    constexpr HttpLimits limits{.connect = 10s, .head = 10s, .whole = 0s, .silence = 300ms};
    most = 20; // a second's worth
    EXPECT_EQ(ask({"HTTP/1.1 200 OK\r\n\r\n", Reply::KEEP, "x", 50ms}, limits).outcome,
              Outcome::partial);
    EXPECT_EQ(received, most);
    EXPECT_EQ(ask({"HTTP/1.1 200 OK\r\n\r\nx", Reply::HOLD}, limits).outcome, Outcome::partial);
}

TEST_F(HttpClientTest, ARedirectIsNotFollowed) {
    const HttpClientAnswer answer =
        ask({"HTTP/1.1 302 Found\r\nLocation: http://127.0.0.1:1/\r\nContent-Length: 0\r\n\r\n"},
            patient);
    EXPECT_EQ(answer.status, 302);
    EXPECT_EQ(answer.outcome, Outcome::whole);
}

TEST_F(HttpClientTest, TheProxyOfTheEnvironmentIsNotUsed) {
    setenv("http_proxy", "http://127.0.0.1:1", 1);
    setenv("ALL_PROXY", "http://127.0.0.1:1", 1);
    EXPECT_EQ(ask({"HTTP/1.1 204 Gone\r\n\r\n"}, patient).outcome, Outcome::whole);
    unsetenv("http_proxy");
    unsetenv("ALL_PROXY");
}

TEST_F(HttpClientTest, AnExceptionOfTheReceiverReachesTheCaller) {
    const ScriptedServer server(
        [&](const ScriptedServer::Request&) { return ScriptedServer::status(200, "body"); });
    HttpClient client(
        {{.isSecure = false, .host = "127.0.0.1", .port = server.port(), .target = "/"},
         "",
         "",
         "test"});
    HttpClientRequest request{.method = "GET", .target = "/", .limits = patient};
    request.receive = [](int, std::string_view) -> bool { throw std::string("enough"); };
    EXPECT_THROW(client.send(request, giveUp.get_token()), std::string);
    request.receive = [](int, std::string_view) { return true; };
    EXPECT_EQ(client.send(request, giveUp.get_token()).outcome, Outcome::whole);
}

TEST_F(HttpClientTest, ARequestAfterGivingUpIsNotSent) {
    giveUp.request_stop();
    EXPECT_EQ(ask(ScriptedServer::status(200), patient).outcome, Outcome::stopped);
}

TEST_F(HttpClientTest, ChildrenInheritNoDescriptor) {
    const ScriptedServer server(
        [&](const ScriptedServer::Request&) { return ScriptedServer::status(200); });
    const auto inheritable = [] {
        int count = 0;
        for (int fd = 3; fd < FD_SETSIZE; ++fd) {
            const int flags = fcntl(fd, F_GETFD);
            count += flags != -1 && (flags & FD_CLOEXEC) == 0 ? 1 : 0;
        }
        return count;
    };
    const int before = inheritable();
    HttpClient client(
        {{.isSecure = false, .host = "127.0.0.1", .port = server.port(), .target = "/"},
         "",
         "",
         "test"});
    EXPECT_EQ(client.send({.method = "GET", .target = "/", .limits = patient}, giveUp.get_token())
                  .outcome,
              Outcome::whole);
    // The server's own two may be among them, at most.
    EXPECT_LE(inheritable(), before + 1);
}
