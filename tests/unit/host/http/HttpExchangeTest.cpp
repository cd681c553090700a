#include "host/http/HttpExchange.h"

#include "host/http/HttpServer.h"
#include "host/http/RequestHead.h"
#include "host/http/RequestRefused.h"
#include "support/RecordingTrace.h"
#include "unit/host/http/Handoff.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <csignal>
#include <future>
#include <stdexcept>
#include <string>
#include <thread>

#include <httplib.h>

namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

const std::string secret(64, 'a');

class HttpExchangeTest : public testing::Test {
protected:
    void SetUp() override {
        std::signal(SIGPIPE, SIG_IGN); // the agent's threads block it
        for (const char* const method : {"GET", "POST", "DELETE"}) {
            router.add(method, "/answer",
                       [this](const HttpRequest& request) { return handle(request); });
        }
        ASSERT_EQ(server.start({"127.0.0.1", 0}, ApiToken(secret)), "");
    }
    /// Gives the answer that the test has set.
    HttpAnswer handle(const HttpRequest& request) {
        handoff.pass();
        body = request.body;
        HttpAnswer given = answer;
        if (given.stream) {
            given.stream = [this, stream = answer.stream](const BodyWriter& write,
                                                          const std::stop_token& stop) {
                stream(write, stop);
                handoff.pass();
            };
        }
        handoff.pass();
        return given;
    }
    httplib::Client client() {
        handoff.pass();
        httplib::Client result("127.0.0.1", server.port());
        result.set_bearer_token_auth(secret);
        result.set_read_timeout(30s);
        return result;
    }

    RecordingTrace trace{0};
    Handoff handoff;
    HttpAnswer answer = HttpAnswer::json("{}");
    std::string body;
    Router router;
    HttpServer server{router};
};

TEST_F(HttpExchangeTest, AnswersHaveTheirOwnHeadersInPlaceOfTheUsualOnes) {
    answer.headers = {{"Cache-Control", "max-age=60"}, {"X-Own", "1"}};
    const auto result = client().Get("/answer");
    ASSERT_TRUE(result);
    EXPECT_EQ(result->get_header_value_count("Cache-Control"), 1u);
    EXPECT_EQ(result->get_header_value("Cache-Control"), "max-age=60");
    EXPECT_EQ(result->get_header_value("X-Own"), "1");
    EXPECT_EQ(result->get_header_value("X-Content-Type-Options"), "nosniff");
    EXPECT_THAT(result->get_header_value("Date"),
                testing::MatchesRegex("[A-Z][a-z][a-z], .. [A-Z][a-z][a-z] .... ..:..:.. GMT"));
    handoff.pass();
    answer.status = 204;
    const auto none = client().Delete("/answer");
    ASSERT_TRUE(none);
    EXPECT_EQ(none->status, 204);
    EXPECT_EQ(none->body, "");
    EXPECT_FALSE(none->has_header("Content-Type"));
}

TEST_F(HttpExchangeTest, OneConnectionServesManyRequests) {
    httplib::Client kept = client();
    kept.set_keep_alive(true);
    for (int count = 0; count < 5; ++count) {
        const auto result = kept.Post("/answer", std::to_string(count), "application/json");
        ASSERT_TRUE(result);
        handoff.pass();
        EXPECT_EQ(body, std::to_string(count));
        EXPECT_EQ(result->get_header_value("Connection"), "");
        handoff.pass();
        EXPECT_EQ(kept.Head("/answer")->status, 200);
    }
    EXPECT_EQ(server.connections(), 1u);
}

TEST_F(HttpExchangeTest, ARequestIsReadAsItWasSent) {
    HttpRequest seen;
    Router other;
    other.add("GET", "/a/{name}", [&](const HttpRequest& request) {
        handoff.pass();
        seen = request;
        handoff.pass();
        return HttpAnswer::json("{}");
    });
    HttpServer another(other);
    ASSERT_EQ(another.start({"127.0.0.1", 0}, ApiToken(secret)), "");
    httplib::Client asking("127.0.0.1", another.port());
    asking.set_bearer_token_auth(secret);
    EXPECT_EQ(asking
                  .Get("/a/x%2Fy%25?b=1%202&b=%26",
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
    EXPECT_EQ(asking.Head("/a/x")->status, 200);
    handoff.pass();
    EXPECT_EQ(seen.method, "GET");
}

TEST_F(HttpExchangeTest, TheLastAnswerOfAConnectionSaysSo) {
    httplib::Client kept = client();
    kept.set_keep_alive(true);
    for (std::size_t count = 1; count <= HttpExchange::requestsPerConnection; ++count) {
        const auto result = kept.Get("/answer");
        ASSERT_TRUE(result) << count;
        ASSERT_EQ(result->get_header_value("Connection"),
                  count == HttpExchange::requestsPerConnection ? "close" : "")
            << count;
    }
}

TEST_F(HttpExchangeTest, AStreamIsSentAsItIsWritten) {
    std::promise<void> seen;
    std::future<void> isSeen = seen.get_future();
    answer.contentType = "text/event-stream";
    answer.stream = [&](const BodyWriter& write, const std::stop_token&) {
        EXPECT_TRUE(write("first"));
        // What was written must have come before anything follows.
        EXPECT_EQ(isSeen.wait_for(20s), std::future_status::ready);
        EXPECT_TRUE(write(""));
        EXPECT_TRUE(write("second"));
    };
    std::string text;
    httplib::Client asking = client();
    const auto result = asking.Get("/answer", {{"Accept-Encoding", "gzip, br"}},
                                   [&](const char* data, std::size_t size) {
                                       text.append(data, size);
                                       if (text == "first") {
                                           seen.set_value();
                                       }
                                       return true;
                                   });
    ASSERT_TRUE(result);
    server.stop(Clock::now() + 30s);
    EXPECT_EQ(text, "firstsecond");
    EXPECT_EQ(result->get_header_value("Content-Type"), "text/event-stream");
}

TEST_F(HttpExchangeTest, HeadBeginsNoStream) {
    std::atomic<bool> hasBegun{false};
    answer.stream = [&](const BodyWriter&, const std::stop_token&) { hasBegun = true; };
    EXPECT_EQ(client().Head("/answer")->status, 200);
    EXPECT_FALSE(hasBegun);
}

TEST_F(HttpExchangeTest, AStreamLearnsThatItsClientHasGone) {
    std::promise<bool> gone;
    answer.stream = [&](const BodyWriter& write, const std::stop_token& stop) {
        while (write("") && !stop.stop_requested()) {
            std::this_thread::sleep_for(5ms);
        }
        gone.set_value(!stop.stop_requested());
    };
    {
        httplib::Client asking = client();
        asking.set_read_timeout(50ms);
        EXPECT_FALSE(asking.Get("/answer"));
    }
    EXPECT_TRUE(gone.get_future().get());
    server.stop(Clock::now() + 30s);
}

TEST_F(HttpExchangeTest, AStreamThatThrowsEndsAlone) {
    trace.setLevel(TRC1_ERROR);
    answer.stream = [](const BodyWriter&, const std::stop_token&) {
        throw std::runtime_error("disk I/O error");
    };
    EXPECT_EQ(client().Get("/answer")->body, "");
    handoff.pass();
    answer.stream = nullptr;
    EXPECT_EQ(client().Get("/answer")->status, 200);
    EXPECT_THAT(trace.messages(), testing::ElementsAre("A stream broke off: disk I/O error"));
}

TEST_F(HttpExchangeTest, AStopEndsStreams) {
    std::promise<void> begun;
    answer.stream = [&](const BodyWriter&, const std::stop_token& stop) {
        begun.set_value();
        while (!stop.stop_requested()) {
            std::this_thread::sleep_for(1ms);
        }
    };
    auto asked = std::async(std::launch::async, [this] { return client().Get("/answer")->status; });
    begun.get_future().wait();
    const auto begin = Clock::now();
    server.stop(begin + 30s);
    EXPECT_LT(Clock::now() - begin, 5s);
    EXPECT_EQ(asked.get(), 200);
    EXPECT_EQ(server.connections(), 0u);
}

TEST_F(HttpExchangeTest, AStopDoesNotWaitForAClientThatTakesNothing) {
    std::promise<void> full;
    answer.stream = [&](const BodyWriter& write, const std::stop_token&) {
        const std::string piece(1 << 20, 'x');
        bool isThere = true;
        for (int count = 0; isThere; ++count) {
            if (count == 16) {
                full.set_value(); // more than the sockets hold; the next write waits
            }
            isThere = write(piece);
        }
    };
    std::promise<void> over;
    std::shared_future<void> isOver = over.get_future().share();
    std::promise<void> begun;
    std::thread silent([&] {
        httplib::Client asking = client();
        std::size_t got = 0;
        asking.Get("/answer", [&](const char*, std::size_t size) {
            got += size;
            if (got > (20u << 20)) {
                isOver.wait(); // takes no more
                return false;
            }
            return true;
        });
    });
    full.get_future().wait();
    const auto begin = Clock::now();
    server.stop(begin + 30s);
    EXPECT_LT(Clock::now() - begin, 10s);
    EXPECT_EQ(server.connections(), 0u);
    over.set_value();
    silent.join();
}

TEST_F(HttpExchangeTest, WhatWasAnsweredIsCounted) {
    client().Get("/answer");
    client().Head("/answer");
    client().Get("/nothing");
    client().Delete("/nothing");
    httplib::Client("127.0.0.1", server.port()).Get("/answer");
    client().Get("/" + std::string(RequestHead::largestTarget, 'x'));
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
