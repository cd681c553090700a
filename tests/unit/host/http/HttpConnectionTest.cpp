#include "host/http/HttpConnection.h"

#include "host/http/HttpServer.h"
#include "host/http/RequestStatistics.h"
#include "host/http/Router.h"
#include "support/ReasonOf.h"
#include "support/RecordingTrace.h"
#include "unit/host/http/Handoff.h"
#include "unit/host/http/TestClient.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <condition_variable>
#include <csignal>
#include <functional>
#include <future>
#include <memory>
#include <mutex>
#include <stop_token>
#include <string>
#include <string_view>
#include <thread>

#include <sys/socket.h>
#include <unistd.h>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

const std::string secret(64, 'a');

class HttpConnectionTest : public testing::Test {
protected:
    void SetUp() override {
        std::signal(SIGPIPE, SIG_IGN); // the agent's threads block it
        for (const char* const method : {"GET", "POST", "DELETE"}) {
            router.add(method, "/answer",
                       [this](const HttpRequest& request) { return handle(request); });
        }
        ASSERT_EQ(reasonOf(server.start({"127.0.0.1", 0}, ApiToken(secret))), "");
    }
    /// Returns the answer that the test has set.
    HttpAnswer handle(const HttpRequest& request) {
        handoff.pass();
        body = request.body;
        HttpAnswer given = answer;
        cancelled = request.cancelled;
        handoff.pass();
        if (work) {
            work(request);
        }
        return given;
    }
    TestClient client() {
        handoff.pass();
        return {"127.0.0.1", server.port(), secret};
    }
    std::string head(const std::string& path) const {
        return "GET " + path + " HTTP/1.1\r\nHost: localhost:" + std::to_string(server.port()) +
               "\r\nAuthorization: Bearer " + secret + "\r\n\r\n";
    }
    /// Makes the answer a stream whose channel the test gets.
    std::future<std::shared_ptr<BodyChannel>> streams() {
        auto begun = std::make_shared<std::promise<std::shared_ptr<BodyChannel>>>();
        answer.stream.begin = [begun](std::shared_ptr<BodyChannel> channel) {
            begun->set_value(std::move(channel));
        };
        answer.stream.changed = [this] {
            const std::lock_guard guard(mutex);
            changed.notify_all();
        };
        return begun->get_future();
    }
    bool waitFor(const std::function<bool()>& condition) {
        std::unique_lock lock(mutex);
        return changed.wait_for(lock, 30s, condition);
    }

    RecordingTrace trace{0};
    Handoff handoff;
    HttpAnswer answer = HttpAnswer::json("{}");
    std::string body;
    std::function<void(const HttpRequest&)> work; ///< what else the handler does
    std::stop_token cancelled;                    ///< of the last request
    std::mutex mutex;
    std::condition_variable changed; ///< a channel has changed
    Router router;
    HttpServer server{router};
};

TEST_F(HttpConnectionTest, AnswersMayReplaceTheUsualHeaders) {
    answer.headers = {{"Cache-Control", "max-age=60"}, {"X-Own", "1"}};
    const auto result = client().get("/answer");
    ASSERT_TRUE(result);
    EXPECT_EQ(result->headers.count("cache-control"), 1u);
    EXPECT_EQ(result->header("cache-control"), "max-age=60");
    EXPECT_EQ(result->header("x-own"), "1");
    EXPECT_EQ(result->header("x-content-type-options"), "nosniff");
    EXPECT_THAT(result->header("date"),
                testing::MatchesRegex("[A-Z][a-z][a-z], .. [A-Z][a-z][a-z] .... ..:..:.. GMT"));
    handoff.pass();
    answer.status = 204;
    const auto none = client().ask("DELETE", "/answer");
    ASSERT_TRUE(none);
    EXPECT_EQ(none->status, 204);
    EXPECT_EQ(none->body, "");
    EXPECT_FALSE(none->headers.count("content-type"));
}

TEST_F(HttpConnectionTest, OneConnectionServesManyRequests) {
    TestClient kept = client();
    for (int count = 0; count < 5; ++count) {
        const auto result = kept.post("/answer", std::to_string(count));
        ASSERT_TRUE(result);
        handoff.pass();
        EXPECT_EQ(body, std::to_string(count));
        EXPECT_EQ(result->header("connection"), "");
        handoff.pass();
        EXPECT_EQ(kept.ask("HEAD", "/answer")->status, 200);
    }
    EXPECT_EQ(server.connections(), 1u);
}

TEST_F(HttpConnectionTest, PassesTheRequestToItsHandler) {
    HttpRequest seen;
    Router other;
    other.add("GET", "/a/{name}", [&](const HttpRequest& request) {
        handoff.pass();
        seen = request;
        handoff.pass();
        return HttpAnswer::json("{}");
    });
    HttpServer another(other);
    ASSERT_EQ(reasonOf(another.start({"127.0.0.1", 0}, ApiToken(secret))), "");
    TestClient asking("127.0.0.1", another.port(), secret);
    EXPECT_EQ(asking
                  .get("/a/x%2Fy%25?b=1%202&b=%26",
                       {{"Last-Event-ID", "7"}, {"Accept", "text/event-stream"}})
                  ->status,
              200);
    handoff.pass();
    EXPECT_EQ(seen.method, "GET");
    EXPECT_EQ(seen.path, "/a/x%2Fy%25");
    EXPECT_THAT(seen.captures, testing::ElementsAre("x/y%"));
    EXPECT_THAT(seen.query,
                testing::ElementsAre(testing::Pair("b", "1 2"), testing::Pair("b", "&")));
    EXPECT_EQ(seen.lastEventId, "7");
    EXPECT_EQ(seen.accept, "text/event-stream");
    handoff.pass();
    EXPECT_EQ(asking.ask("HEAD", "/a/x")->status, 200);
    handoff.pass();
    EXPECT_EQ(seen.method, "GET");
}

TEST_F(HttpConnectionTest, TheLastAnswerOfAConnectionSaysSo) {
    TestClient kept = client();
    for (std::size_t count = 1; count <= HttpConnection::requestsPerConnection; ++count) {
        const auto result = kept.get("/answer");
        ASSERT_TRUE(result) << count;
        ASSERT_EQ(result->header("connection"),
                  count == HttpConnection::requestsPerConnection ? "close" : "")
            << count;
    }
}

TEST_F(HttpConnectionTest, AStreamIsSentAsItIsWritten) {
    answer.contentType = "text/event-stream";
    auto begun = streams();
    std::promise<void> seen;
    std::string text;
    auto asked = std::async(std::launch::async, [&, asking = client()]() mutable {
        return asking.follow("/answer", [&](std::string_view part) {
            text += part;
            if (text == "first") {
                seen.set_value();
            }
            return true;
        });
    });
    const std::shared_ptr<BodyChannel> channel = begun.get();
    channel->send("first");
    // What was written must arrive before anything follows.
    seen.get_future().wait();
    EXPECT_TRUE(waitFor([&] { return channel->isReady(); }));
    channel->send("");
    channel->send("second");
    channel->end();
    const auto result = asked.get();
    ASSERT_TRUE(result);
    EXPECT_EQ(text, "firstsecond");
    EXPECT_EQ(result->header("content-type"), "text/event-stream");
    EXPECT_EQ(result->header("transfer-encoding"), "chunked");
    EXPECT_TRUE(waitFor([&] { return !channel->isOpen(); }));
    channel->send("nobody is there");
    channel->end();
}

TEST_F(HttpConnectionTest, AnHttp10ClientGetsAStreamWithoutChunks) {
    auto begun = streams();
    auto asked = std::async(std::launch::async, [&, asking = client()]() mutable {
        std::string request = head("/answer");
        request.replace(request.find("HTTP/1.1"), 8, "HTTP/1.0");
        return asking.raw(request);
    });
    const std::shared_ptr<BodyChannel> channel = begun.get();
    channel->send("text");
    channel->end();
    EXPECT_THAT(asked.get(), testing::AllOf(testing::HasSubstr("\r\nConnection: close\r\n"),
                                            testing::EndsWith("\r\n\r\ntext")));
}

TEST_F(HttpConnectionTest, HeadStartsNoStream) {
    std::atomic<bool> hasBegun{false};
    answer.stream.begin = [&](const auto&) { hasBegun = true; };
    EXPECT_EQ(client().ask("HEAD", "/answer")->status, 200);
    EXPECT_FALSE(hasBegun);
}

TEST_F(HttpConnectionTest, AStreamNoticesThatItsClientHasGone) {
    auto begun = streams();
    const int fd = TestClient::connected(server.port());
    const std::string request = head("/answer");
    send(fd, request.data(), request.size(), MSG_NOSIGNAL);
    const std::shared_ptr<BodyChannel> channel = begun.get();
    EXPECT_TRUE(channel->isOpen());
    close(fd);
    EXPECT_TRUE(waitFor([&] { return !channel->isOpen(); }));
    server.stop(Clock::now() + 30s);
}

TEST_F(HttpConnectionTest, AStreamIsNotReadyWhileItsClientTakesNothing) {
    auto begun = streams();
    const int fd = TestClient::connected(server.port());
    const std::string request = head("/answer");
    send(fd, request.data(), request.size(), MSG_NOSIGNAL);
    const std::shared_ptr<BodyChannel> channel = begun.get();
    EXPECT_TRUE(channel->isReady());
    channel->send(std::string(32 << 20, 'x')); // more than fits into the sockets
    EXPECT_FALSE(channel->isReady());
    // A client that takes nothing for five seconds is disconnected.
    EXPECT_TRUE(waitFor([&] { return !channel->isOpen(); }));
    EXPECT_FALSE(channel->isReady());
    close(fd);
}

TEST_F(HttpConnectionTest, AStopEndsStreams) {
    auto begun = streams();
    auto asked = std::async(std::launch::async, [asking = client()]() mutable {
        return asking.get("/answer")->status;
    });
    const std::shared_ptr<BodyChannel> channel = begun.get();
    const auto begin = Clock::now();
    server.stop(begin + 30s);
    EXPECT_LT(Clock::now() - begin, 5s);
    EXPECT_EQ(asked.get(), 200) << "the stream ends in order";
    EXPECT_FALSE(channel->isOpen());
    EXPECT_EQ(server.connections(), 0u);
}

TEST_F(HttpConnectionTest, AStopDoesNotWaitForAClientThatTakesNothing) {
    auto begun = streams();
    const int fd = TestClient::connected(server.port());
    const std::string request = head("/answer");
    send(fd, request.data(), request.size(), MSG_NOSIGNAL);
    const std::shared_ptr<BodyChannel> channel = begun.get();
    channel->send(std::string(32 << 20, 'x'));
    const auto begin = Clock::now();
    server.stop(begin + 30s);
    EXPECT_LT(Clock::now() - begin, 10s);
    EXPECT_EQ(server.connections(), 0u);
    close(fd);
}

TEST_F(HttpConnectionTest, AHandlerNoticesThatItsClientHasGone) {
    std::promise<void> begun;
    std::promise<bool> asked;
    work = [&](const HttpRequest& request) {
        begun.set_value();
        for (int count = 0; count < 3000 && !request.cancelled.stop_requested(); ++count) {
            std::this_thread::sleep_for(10ms);
        }
        asked.set_value(request.cancelled.stop_requested());
    };
    handoff.pass();
    const int fd = TestClient::connected(server.port());
    const std::string request = head("/answer");
    send(fd, request.data(), request.size(), MSG_NOSIGNAL);
    begun.get_future().wait();
    close(fd);
    EXPECT_TRUE(asked.get_future().get());
}

TEST_F(HttpConnectionTest, AHandlerNoticesThatTheServerStops) {
    std::promise<void> begun;
    work = [&](const HttpRequest& request) {
        begun.set_value();
        while (!request.cancelled.stop_requested()) {
            std::this_thread::sleep_for(1ms);
        }
    };
    auto asked = std::async(std::launch::async, [asking = client()]() mutable {
        return asking.get("/answer")->status;
    });
    begun.get_future().wait();
    server.stop(Clock::now() + 30s);
    EXPECT_EQ(asked.get(), 200) << "the body is complete";
}

TEST_F(HttpConnectionTest, NothingIsCancelledWhileTheClientWaits) {
    work = [&](const HttpRequest& request) {
        std::this_thread::sleep_for(20ms);
        EXPECT_TRUE(request.cancelled.stop_possible());
        EXPECT_FALSE(request.cancelled.stop_requested());
    };
    EXPECT_EQ(client().get("/answer")->status, 200);
}

TEST_F(HttpConnectionTest, PipelinedRequestsAreAnsweredInOrder) {
    std::string last = head("/nothing");
    last.insert(last.size() - 2, "Connection: close\r\n");
    const std::string answers = client().raw("\r\n" + head("/answer") + "\r\n\r\n" +
                                             head("/answer") + last + head("/answer"));
    const auto first = answers.find("HTTP/1.1 200 OK\r\n");
    const auto second = answers.find("HTTP/1.1 200 OK\r\n", first + 1);
    const auto third = answers.find("HTTP/1.1 404 Not Found\r\n");
    EXPECT_LT(first, second);
    EXPECT_LT(second, third);
    EXPECT_NE(third, std::string::npos);
    EXPECT_EQ(answers.find("HTTP/1.1", third + 1), std::string::npos);
}

TEST_F(HttpConnectionTest, AClientThatExpectsContinueGetsIt) {
    std::string request = head("/answer");
    request.replace(0, 3, "POST");
    request.insert(request.size() - 2, "Content-Type: application/json\r\nContent-Length: 2\r\n"
                                       "Expect: 100-continue\r\nConnection: close\r\n");
    const int fd = TestClient::connected(server.port());
    send(fd, request.data(), request.size(), MSG_NOSIGNAL);
    const std::string wanted = "HTTP/1.1 100 Continue\r\n\r\n";
    std::string got(wanted.size(), ' ');
    EXPECT_EQ(recv(fd, got.data(), got.size(), MSG_WAITALL), static_cast<ssize_t>(got.size()));
    EXPECT_EQ(got, wanted);
    send(fd, "{}", 2, MSG_NOSIGNAL);
    got.assign(12, ' ');
    recv(fd, got.data(), got.size(), MSG_WAITALL);
    EXPECT_EQ(got, "HTTP/1.1 200");
    close(fd);
}

TEST_F(HttpConnectionTest, AnsweredRequestsAreCounted) {
    client().get("/answer");
    client().ask("HEAD", "/answer");
    client().get("/nothing");
    client().ask("DELETE", "/nothing");
    TestClient("127.0.0.1", server.port()).get("/answer");
    client().get("/" + std::string(RequestParser::largestTarget, 'x'));
    const auto counts = server.statistics().counts();
    using Kind = RequestStatistics::Kind;
    EXPECT_EQ(counts.at(Kind{"GET", "/answer", 200}), 1u);
    EXPECT_EQ(counts.at(Kind{"HEAD", "/answer", 200}), 1u);
    EXPECT_EQ(counts.at(Kind{"GET", "/answer", 401}), 1u);
    EXPECT_EQ(counts.at(Kind{"GET", "", 404}), 1u);
    EXPECT_EQ(counts.at(Kind{"DELETE", "", 404}), 1u);
    EXPECT_EQ(counts.at(Kind{"GET", "", 414}), 1u);
    EXPECT_EQ(counts.size(), 6u);
}

} // namespace
