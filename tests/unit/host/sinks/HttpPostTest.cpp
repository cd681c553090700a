#include "host/sinks/HttpPost.h"

#include "LocalSocket.h"
#include "ScriptedServer.h"
#include "SinkTest.h"
#include "support/FakeResolver.h"
#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <csignal>
#include <thread>

#include <sys/socket.h>
#include <unistd.h>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;
using Reply = ScriptedServer::Reply;
using Request = ScriptedServer::Request;
using testing::ElementsAre;

SinkConfig configOf(const std::string& url, std::chrono::milliseconds timeout = 10s) {
    return within(timeout, sinkConfig("type = 'webhook'\nurl = '" + url + "'"));
}

class HttpPostTest : public testing::Test {
protected:
    bool send(HttpPost& http, const std::string& body = "{}") {
        return http.send(body, {}, giveUp.get_token());
    }

    RecordingTrace trace{0};
    std::stop_source giveUp;
};

TEST_F(HttpPostTest, SendsBodyAndHeadersAndReturnsTheAnswer) {
    ScriptedServer receiver([](const Request&) { return ScriptedServer::status(202, "thanks"); });
    SinkConfig config = configOf(receiver.url("/base/?key=%20a"));
    config.options["headers"] = SinkConfig::Texts{{"Authorization", "Bearer abc"}};
    HttpPost http(config, "/v1/logs");
    EXPECT_TRUE(http.send("{\"a\":1}", {{"X-One", "1"}}, giveUp.get_token()));
    EXPECT_EQ(http.answer(), "thanks");
    const std::vector<Request> requests = receiver.requests();
    ASSERT_EQ(requests.size(), 1u);
    EXPECT_EQ(requests[0].line, "POST /base/v1/logs?key=%20a HTTP/1.1");
    EXPECT_EQ(requests[0].body, "{\"a\":1}");
    EXPECT_EQ(requests[0].header("content-type"), "application/json");
    EXPECT_EQ(requests[0].header("authorization"), "bearer abc");
    EXPECT_EQ(requests[0].header("x-one"), "1");
    EXPECT_EQ(requests[0].header("user-agent"), "zrmagent");
    EXPECT_EQ(requests[0].header("host"), "127.0.0.1:" + std::to_string(receiver.port()));
}

TEST_F(HttpPostTest, KeepsTheConnection) {
    ScriptedServer receiver([](const Request&) { return ScriptedServer::status(204); });
    HttpPost http(configOf(receiver.url()), "");
    EXPECT_TRUE(send(http));
    EXPECT_TRUE(send(http));
    ASSERT_EQ(receiver.requests().size(), 2u);
    EXPECT_EQ(receiver.requests()[1].connection, 1);
}

TEST_F(HttpPostTest, AConnectionThatTheReceiverClosedIsOpenedAgain) {
    // Closed after an answer, and closed as soon as it is used again.
    ScriptedServer receiver([count = 0](const Request&) mutable {
        ++count;
        Reply reply = ScriptedServer::status(200);
        if (count == 1) {
            reply.then = Reply::CLOSE;
        } else if (count == 3) {
            reply = {"", Reply::CLOSE};
        }
        return reply;
    });
    HttpPost http(configOf(receiver.url()), "");
    EXPECT_TRUE(send(http, "1"));
    EXPECT_TRUE(send(http, "2"));
    EXPECT_TRUE(send(http, "3"));
    EXPECT_THAT(receiver.bodies(), ElementsAre("1", "2", "3", "3"));
}

TEST_F(HttpPostTest, EveryOtherStatusIsAFailureWithItsReason) {
    int status = 0;
    ScriptedServer receiver(
        [&](const Request&) { return ScriptedServer::status(status, "no\nwhy \xff"); });
    HttpPost http(configOf(receiver.url()), "");
    for (const int refusal : {301, 302, 400, 401, 404, 413, 500, 503}) {
        receiver.set(status, refusal);
        EXPECT_FALSE(send(http));
        EXPECT_EQ(http.error(), "127.0.0.1:" + std::to_string(receiver.port()) +
                                    " answered with status " + std::to_string(refusal) +
                                    ": no why  ");
    }
    receiver.set(status, 200);
    EXPECT_TRUE(send(http));
}

TEST_F(HttpPostTest, WithoutAReceiverThereIsNoConnection) {
    std::string url;
    {
        const ScriptedServer gone([](const Request&) { return Reply{}; });
        url = gone.url();
    }
    HttpPost http(configOf(url), "");
    EXPECT_FALSE(send(http));
    EXPECT_EQ(http.error(), "no connection (" + url.substr(7) + ")");
}

TEST_F(HttpPostTest, AnIncompleteOrInvalidAnswerIsAFailure) {
    Reply reply;
    ScriptedServer receiver([&](const Request&) { return reply; });
    HttpPost http(configOf(receiver.url(), 2s), "");
    const std::string place = " (127.0.0.1:" + std::to_string(receiver.port()) + ")";
    const auto expectError = [&](const char* bytes, const std::string& error) {
        receiver.set(reply, Reply{bytes, Reply::CLOSE});
        EXPECT_FALSE(send(http)) << bytes;
        EXPECT_EQ(http.error(), error + place) << bytes;
    };
    for (const char* const bytes :
         {"", "HTTP/1.1 20", "HTTP/1.1 200 OK\r\nContent-Le", "\0\1\2\3garbage\r\n\r\n"}) {
        expectError(bytes, "the connection ended before the answer was complete");
    }
    for (const char* const bytes :
         {"220 mail.example.com ESMTP\r\n", "\r\n\r\n", "HTTP/1.1 999999999999 X\r\n\r\n"}) {
        expectError(bytes, "the answer is not HTTP, or its head is longer than 64 kB");
    }
    receiver.set(reply, ScriptedServer::status(200));
    EXPECT_TRUE(send(http));
}

TEST_F(HttpPostTest, OnlyTheStatusDecides) {
    ScriptedServer receiver([](const Request&) {
        return Reply{"HTTP/1.1 200 OK\r\nContent-Length: 100\r\n\r\n{\"partial", Reply::CLOSE};
    });
    HttpPost http(configOf(receiver.url()), "");
    EXPECT_TRUE(send(http));
    EXPECT_EQ(http.answer(), "{\"partial");
}

TEST_F(HttpPostTest, AnEndlessHeadIsAFailureAfterWhichTheReceiverIsRetried) {
    Reply reply;
    ScriptedServer receiver([&](const Request&) { return reply; });
    HttpPost http(configOf(receiver.url(), 10s), "");
    for (const char* const endless : {"x", "X-More: yes\r\n"}) {
        receiver.set(reply, Reply{"HTTP/1.1 200 ", Reply::KEEP, std::string(endless)});
        EXPECT_FALSE(send(http)) << endless;
        EXPECT_THAT(http.error(), testing::StartsWith("the answer is not HTTP, or its head is "));
    }
    receiver.set(reply, ScriptedServer::status(200));
    EXPECT_TRUE(send(http)) << http.error();
}

TEST_F(HttpPostTest, AReasonPhraseMayBeLong) {
    ScriptedServer receiver([](const Request&) {
        return Reply{"HTTP/1.1 200 " + std::string(40'000, 'x') + "\r\nContent-Length: 0\r\n\r\n"};
    });
    HttpPost http(configOf(receiver.url()), "");
    EXPECT_TRUE(send(http)) << http.error();
}

TEST_F(HttpPostTest, KeepsOnlyTheBeginningOfALongAnswer) {
    ScriptedServer receiver(
        [](const Request&) { return ScriptedServer::status(200, std::string(1 << 20, 'x')); });
    HttpPost http(configOf(receiver.url()), "");
    EXPECT_TRUE(send(http));
    EXPECT_EQ(http.answer().size(), 65536u);
    EXPECT_TRUE(send(http));
}

TEST_F(HttpPostTest, AReceiverThatDoesNotAnswerTimesOut) {
    ScriptedServer receiver([](const Request&) {
        return Reply{"HTTP/1.1 200 OK\r\n", Reply::HOLD};
    });
    HttpPost http(configOf(receiver.url(), 200ms), "");
    const Clock::time_point begin = Clock::now();
    EXPECT_FALSE(send(http));
    EXPECT_LT(Clock::now() - begin, 5s);
    EXPECT_EQ(http.error(),
              "no answer in time (127.0.0.1:" + std::to_string(receiver.port()) + ")");
}

TEST_F(HttpPostTest, EndsAtOnceOnGiveUp) {
    ScriptedServer receiver([](const Request&) { return Reply{"", Reply::HOLD}; });
    HttpPost http(configOf(receiver.url(), 60s), "");
    std::jthread stopper([this, &receiver] {
        while (receiver.requests().empty()) {
            std::this_thread::sleep_for(1ms);
        }
        giveUp.request_stop();
    });
    const Clock::time_point begin = Clock::now();
    EXPECT_FALSE(send(http));
    EXPECT_LT(Clock::now() - begin, 10s);
    EXPECT_EQ(http.error(),
              "the agent is stopping (127.0.0.1:" + std::to_string(receiver.port()) + ")");
}

/// A port at which connections are neither accepted nor refused: its backlog is full.
class FullPort {
public:
    FullPort() : m_listener(localSocket(SOCK_STREAM, port)) {
        const sockaddr_in address = localAddress(port);
        listen(m_listener, 0);
        for (int count = 0; count < 4; ++count) {
            const int one = socket(AF_INET, SOCK_STREAM | SOCK_NONBLOCK, 0);
            connect(one, reinterpret_cast<const sockaddr*>(&address), sizeof address);
            m_waiting.push_back(one);
        }
    }
    ~FullPort() {
        for (const int one : m_waiting) {
            close(one);
        }
        close(m_listener);
    }
    std::uint16_t port = 0;

private:
    int m_listener;
    std::vector<int> m_waiting;
};

TEST_F(HttpPostTest, ConnectingEndsInTimeAndOnGiveUp) {
    const FullPort full;
    const std::string url = "http://127.0.0.1:" + std::to_string(full.port);
    HttpPost quick(configOf(url, 200ms), "");
    Clock::time_point begin = Clock::now();
    EXPECT_FALSE(send(quick));
    EXPECT_EQ(quick.error(), "no answer in time (" + url.substr(7) + ")");
    EXPECT_LT(Clock::now() - begin, 5s);
    HttpPost patient(configOf(url, 60s), "");
    giveUp.request_stop();
    begin = Clock::now();
    EXPECT_FALSE(send(patient));
    EXPECT_LT(Clock::now() - begin, 5s);
}

TEST_F(HttpPostTest, ALookupEndsInTimeAndOnGiveUp) {
    FakeResolver resolver("127.0.0.1");
    ScriptedServer receiver([](const Request&) { return ScriptedServer::status(204); });
    const std::string place = "slow.example:" + std::to_string(receiver.port());
    HttpPost quick(configOf("http://" + place, 50ms), "");
    EXPECT_FALSE(send(quick));
    EXPECT_EQ(quick.error(), place + " is not known: the system is still looking its name up");
    HttpPost patient(configOf("http://" + place, 60s), "");
    std::jthread stopper([this, &resolver] {
        while (resolver.lookups() < 2) {
            std::this_thread::sleep_for(1ms);
        }
        giveUp.request_stop();
    });
    const Clock::time_point begin = Clock::now();
    EXPECT_FALSE(send(patient));
    EXPECT_LT(Clock::now() - begin, 30s);
    EXPECT_EQ(patient.error(), "the agent is stopping (" + place + ")");
    stopper.join();
    giveUp = {};
    resolver.answer();
    EXPECT_TRUE(send(patient)) << patient.error();
    EXPECT_EQ(receiver.requests().at(0).header("host"), place);
}

TEST_F(HttpPostTest, TriesEachAddressOfAName) {
    // A server that listens at one of the addresses of localhost.
    ScriptedServer receiver([](const Request&) { return ScriptedServer::status(204); });
    HttpPost http(configOf("http://localhost:" + std::to_string(receiver.port())), "");
    EXPECT_TRUE(send(http)) << http.error();
    EXPECT_TRUE(send(http)) << http.error();
    EXPECT_EQ(receiver.requests().at(1).connection, 1);
}

TEST_F(HttpPostTest, AnIpv6AddressIsInBracketsInTheRequest) {
    ScriptedServer receiver([](const Request&) { return ScriptedServer::status(204); });
    const std::string place = "[::ffff:127.0.0.1]:" + std::to_string(receiver.port());
    HttpPost http(configOf("http://" + place), "");
    EXPECT_TRUE(send(http)) << http.error();
    EXPECT_EQ(receiver.requests().at(0).header("host"), place);
}

TEST_F(HttpPostTest, PausesForAsLongAsABusyReceiverAsks) {
    ScriptedServer receiver([count = 0](const Request&) mutable {
        return ++count == 1 ? ScriptedServer::status(429, "later", "Retry-After: 1\r\n")
                            : ScriptedServer::status(200);
    });
    HttpPost http(configOf(receiver.url()), "");
    const Clock::time_point begin = Clock::now();
    EXPECT_FALSE(send(http));
    const std::string error = http.error();
    EXPECT_THAT(error, testing::EndsWith("answered with status 429: later"));
    EXPECT_FALSE(send(http));
    EXPECT_EQ(http.error(), error);
    EXPECT_EQ(receiver.requests().size(), 1u);
    while (!send(http)) {
        ASSERT_LT(Clock::now() - begin, 30s);
        std::this_thread::sleep_for(10ms);
    }
    EXPECT_GE(Clock::now() - begin, 1s);
    EXPECT_EQ(receiver.requests().size(), 2u);
}

TEST_F(HttpPostTest, APauseThatIsNotANumberOfSecondsIsIgnored) {
    for (const char* const value : {"Fri, 20 Nov 2026 07:03:09 GMT", "-5", "", "1x", "0"}) {
        ScriptedServer receiver([&](const Request&) {
            return ScriptedServer::status(503, "", std::string("Retry-After: ") + value + "\r\n");
        });
        HttpPost http(configOf(receiver.url()), "");
        EXPECT_FALSE(send(http));
        EXPECT_FALSE(send(http));
        EXPECT_EQ(receiver.requests().size(), 2u) << value;
    }
}

TEST_F(HttpPostTest, LeavesTheActionAndTheMaskOfSigpipeUnchanged) {
    std::signal(SIGPIPE, SIG_DFL); // a signal that got through would end this program
    sigset_t before;
    pthread_sigmask(SIG_SETMASK, nullptr, &before);
    ScriptedServer receiver([](const Request&) { return Reply{"", Reply::CLOSE}; });
    HttpPost http(configOf(receiver.url()), "");
    const std::string large(8 << 20, ' ');
    EXPECT_FALSE(send(http, large));
    EXPECT_FALSE(send(http, large));
    struct sigaction action {};
    sigaction(SIGPIPE, nullptr, &action);
    EXPECT_EQ(action.sa_handler, SIG_DFL);
    sigset_t after;
    pthread_sigmask(SIG_SETMASK, nullptr, &after);
    EXPECT_EQ(sigismember(&after, SIGPIPE), sigismember(&before, SIGPIPE));
}

TEST_F(HttpPostTest, AServerWithoutTlsIsRefused) {
    ScriptedServer receiver([](const Request&) { return ScriptedServer::status(200); });
    HttpPost http(configOf("https://127.0.0.1:" + std::to_string(receiver.port()), 300ms), "");
    EXPECT_FALSE(send(http));
    EXPECT_TRUE(receiver.requests().empty());
}

} // namespace
