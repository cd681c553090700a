#include "host/http/HttpServer.h"

#include "host/api/AgentResource.h"
#include "host/api/SampleResource.h"
#include "host/http/RequestStatistics.h"
#include "host/http/Router.h"
#include "support/ReasonOf.h"
#include "support/RecordingTrace.h"
#include "unit/host/http/Handoff.h"
#include "unit/host/http/TestClient.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <condition_variable>
#include <csignal>
#include <functional>
#include <future>
#include <mutex>
#include <optional>
#include <stdexcept>
#include <string>
#include <thread>
#include <vector>

#include <nlohmann/json.hpp>
#include <sys/socket.h>
#include <unistd.h>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;
using nlohmann::json;

const std::string secret(64, 'a');
const std::string tables = "/api/v1/tables/";

/// Samples for tests: what `onTake` returns.
class TestSource : public SampleSource {
public:
    Rows take(std::string_view table, const std::vector<Condition>& conditions) override {
        handoff.pass();
        Rows rows = onTake(std::string(table), conditions);
        handoff.pass();
        return rows;
    }
    bool isMonitored(const std::vector<Condition>& report) override {
        handoff.pass();
        const bool answer = onIsMonitored(report);
        handoff.pass();
        return answer;
    }
    Handoff handoff;
    std::function<bool(std::vector<Condition>)> onIsMonitored = [](auto) { return true; };
    std::function<Rows(std::string, std::vector<Condition>)> onTake = [](auto, auto) {
        return Rows{R"([{"LOGNAME":"auth.log"}])", 1, false};
    };
};

class HttpServerTest : public testing::Test {
protected:
    void SetUp() override {
        HealthResource().addRoutes(router);
        samples.addRoutes(router);
        std::signal(SIGPIPE, SIG_IGN); // the agent's threads block it
        ASSERT_EQ(reasonOf(server.start({"127.0.0.1", 0}, ApiToken(secret))), "");
    }

    using Reply = std::optional<TestClient::Reply>;

    TestClient client() const { return {"127.0.0.1", server.port(), secret}; }
    Reply sample(const std::string& table, const std::string& body) {
        source.handoff.pass();
        auto result = client().post(tables + table + "/sample", body);
        source.handoff.pass();
        return result;
    }
    static std::string report() {
        return R"({"filters":[{"column":"LOGPATH","op":"=","value":"/var/log/"},)"
               R"({"column":"LOGNAME","op":"=","value":"auth.log"},)"
               R"({"column":"ENTRYTIME","op":">=","value":"2026-11-20"},)"
               R"({"column":"ENTRYTIME","op":"<=","value":"2026-11-21"}]})";
    }
    static void expectProblem(const Reply& result, int status, const std::string& detail,
                              const std::string& field) {
        ASSERT_TRUE(result);
        EXPECT_EQ(result->status, status);
        EXPECT_EQ(result->header("content-type"), "application/problem+json");
        const json document = json::parse(result->body);
        EXPECT_EQ(document["type"], "about:blank");
        EXPECT_EQ(document["status"], status);
        EXPECT_EQ(document["detail"], detail);
        EXPECT_EQ(document.value("field", ""), field);
    }
    RecordingTrace trace{0};
    TestSource source;
    SampleResource samples{source};
    Router router;
    HttpServer server{router};
};

TEST_F(HttpServerTest, HealthNeedsNoToken) {
    TestClient anonymous("127.0.0.1", server.port());
    const auto result = anonymous.get("/healthz");
    ASSERT_TRUE(result);
    EXPECT_EQ(result->status, 200);
    EXPECT_EQ(result->body, R"({"status":"ok"})");
    EXPECT_EQ(result->header("content-type"), "application/json");
}

TEST_F(HttpServerTest, ASampleReturnsItsRowsAndTheirNumber) {
    source.onTake = [](const std::string& table, const std::vector<Condition>& conditions) {
        EXPECT_EQ(table, "RMMONLOG");
        EXPECT_EQ(conditions.size(), 1u);
        EXPECT_EQ(conditions.at(0).column, "LOGTYPE");
        return SampleSource::Rows{R"([{"LOGTYPE":"S"},{"LOGTYPE":"S"}])", 2, false};
    };
    const auto result =
        sample("RMMONLOG", R"({"filters":[{"column":"LOGTYPE","op":"=","value":"S"}]})");
    ASSERT_TRUE(result);
    EXPECT_EQ(result->status, 200);
    EXPECT_EQ(
        result->body,
        R"({"table":"RMMONLOG","rows":[{"LOGTYPE":"S"},{"LOGTYPE":"S"}],"count":2,"truncated":false,)"
        R"("complete":true,"reached":null,"reason":null})");
    EXPECT_EQ(result->header("content-type"), "application/json");
    EXPECT_EQ(result->header("cache-control"), "no-store");
}

TEST_F(HttpServerTest, AReportSaysThatItWasTruncated) {
    source.onTake = [](const std::string& table, const std::vector<Condition>& conditions) {
        EXPECT_EQ(table, "RMLOGENT");
        EXPECT_EQ(conditions.size(), 4u);
        return SampleSource::Rows{"[{}]", 1, true, {"1261120070309000", "it read enough"}};
    };
    const auto result = sample("RMLOGENT", report());
    ASSERT_TRUE(result);
    EXPECT_EQ(result->body,
              R"({"table":"RMLOGENT","rows":[{}],"count":1,"truncated":true,)"
              R"("complete":false,"reached":"1261120070309000","reason":"it read enough"})");
}

TEST_F(HttpServerTest, AReportOnALogThatIsNotMonitoredIsAProblem) {
    std::vector<std::string> asked;
    bool isMonitored = false;
    source.onIsMonitored = [&](const std::vector<Condition>& report) {
        asked.push_back("monitored " + std::to_string(report.size()));
        return isMonitored;
    };
    source.onTake = [&](const std::string& table, const std::vector<Condition>& conditions) {
        asked.push_back(table + " " + std::to_string(conditions.size()));
        return SampleSource::Rows{"[]", 0, false};
    };
    expectProblem(sample("RMLOGENT", report()), 404, "the agent does not monitor this log",
                  "filters");
    EXPECT_THAT(asked, testing::ElementsAre("monitored 4")) << "the agent is not asked for it";
    isMonitored = true;
    const auto result = sample("RMLOGENT", report());
    ASSERT_TRUE(result);
    EXPECT_EQ(result->body, R"({"table":"RMLOGENT","rows":[],"count":0,"truncated":false,)"
                            R"("complete":true,"reached":null,"reason":null})");
}

TEST_F(HttpServerTest, RefusesRequestsWithoutTheToken) {
    TestClient anonymous("127.0.0.1", server.port());
    const auto result = anonymous.post(tables + "RMMONLOG/sample", "{}");
    expectProblem(result, 401, "send the API token: Authorization: Bearer TOKEN", "Authorization");
    EXPECT_EQ(result->header("www-authenticate"), "Bearer");
    TestClient wrong("127.0.0.1", server.port(), std::string(64, 'b'));
    expectProblem(wrong.post(tables + "RMMONLOG/sample", "{}"), 401,
                  "the token is not the one in the agent's token file", "Authorization");
    expectProblem(wrong.get("/nothing"), 401, "the token is not the one in the agent's token file",
                  "Authorization");
}

TEST_F(HttpServerTest, RefusesOtherHostsAndOrigins) {
    expectProblem(client().get("/healthz", {{"Host", "evil.example"}}), 421,
                  "the Host header must be the address at which the agent listens", "Host");
    EXPECT_THAT(client().raw("GET /healthz HTTP/1.1\r\nConnection: close\r\n\r\n"),
                testing::StartsWith("HTTP/1.1 421 Misdirected Request\r\n"));
    expectProblem(client().get("/healthz", {{"Origin", "http://evil.example"}}), 403,
                  "requests from other origins are refused", "Origin");
}

TEST_F(HttpServerTest, RefusesUnknownPaths) {
    expectProblem(sample("NOTABLE", "{}"), 404,
                  "no such table; the tables are RMLOGENT and RMMONLOG", "table");
    expectProblem(client().get("/nothing"), 404, "there is nothing at this path", "");
    const auto result = client().get(tables + "RMMONLOG/sample");
    expectProblem(result, 405, "this path answers POST, not this method", "");
    EXPECT_EQ(result->header("allow"), "POST");
    expectProblem(client().ask("DELETE", "/healthz"), 405,
                  "this path answers GET, HEAD, not this method", "");
    expectProblem(client().ask("OPTIONS", "/healthz"), 405,
                  "this path answers GET, HEAD, not this method", "");
}

TEST_F(HttpServerTest, RefusesInvalidBodies) {
    expectProblem(sample("RMMONLOG", "{"), 400, "the body is not JSON", "body");
    expectProblem(sample("RMMONLOG", R"({"filters":[{}]})"), 400, "write a text",
                  "filters[0].column");
    expectProblem(
        client().post(tables + "RMMONLOG/sample", "a=1", "application/x-www-form-urlencoded"), 415,
        "send the body as application/json", "Content-Type");
}

TEST_F(HttpServerTest, RefusesLongBodies) {
    const std::string tooLong = "the body has more than 1048576 bytes";
    expectProblem(sample("RMMONLOG", std::string(1048577, ' ')), 413, tooLong, "body");
    expectProblem(sample("RMMONLOG", std::string(1048576, ' ')), 400, "the body is not JSON",
                  "body");
    // A body without a length is cut off, too.
    std::string chunks;
    for (int count = 0; count < 500; ++count) {
        chunks += "2000\r\n" + std::string(8192, ' ') + "\r\n";
    }
    const std::string answer =
        client().raw("POST " + tables + "RMMONLOG/sample HTTP/1.1\r\nHost: localhost:" +
                     std::to_string(server.port()) + "\r\nAuthorization: Bearer " + secret +
                     "\r\nContent-Type: application/json\r\nTransfer-Encoding: chunked\r\n\r\n" +
                     chunks + "0\r\n\r\n");
    EXPECT_THAT(answer,
                testing::AllOf(testing::StartsWith("HTTP/1.1 413 "), testing::HasSubstr(tooLong)));
    EXPECT_EQ(client().get("/healthz")->status, 200);
}

TEST_F(HttpServerTest, ASampleThatFailsIsAnInternalError) {
    trace.setLevel(TRC1_ERROR);
    source.onTake = [](auto, auto) -> SampleSource::Rows { throw std::runtime_error("secret"); };
    expectProblem(sample("RMMONLOG", "{}"), 500, "the request failed", "");
    EXPECT_THAT(trace.messages(),
                testing::ElementsAre("Request for /api/v1/tables/RMMONLOG/sample failed: secret"));
}

TEST_F(HttpServerTest, SamplesRunConcurrently) {
    std::mutex mutex;
    std::condition_variable changed;
    int waiting = 0;
    bool go = false;
    source.onTake = [&](auto, auto) {
        std::unique_lock lock(mutex);
        ++waiting;
        changed.notify_all();
        changed.wait(lock, [&] { return go; }); // as during a refresh
        return SampleSource::Rows{"[]", 0, false};
    };
    std::vector<std::future<int>> results;
    for (int count = 0; count < 3; ++count) {
        results.push_back(std::async(std::launch::async, [this] {
            const auto result = sample("RMMONLOG", "{}");
            return result ? result->status : 0;
        }));
    }
    {
        std::unique_lock lock(mutex);
        EXPECT_TRUE(changed.wait_for(lock, 10s, [&] { return waiting == 3; }));
    }
    EXPECT_EQ(client().get("/healthz")->status, 200) << "others are served in the meantime";
    {
        const std::lock_guard guard(mutex);
        go = true;
    }
    changed.notify_all();
    for (auto& result : results) {
        EXPECT_EQ(result.get(), 200);
    }
}

TEST_F(HttpServerTest, APortInUseIsReported) {
    HttpServer second(router);
    EXPECT_EQ(reasonOf(second.start({"127.0.0.1", server.port()}, ApiToken(secret))),
              "cannot listen on 127.0.0.1:" + std::to_string(server.port()) +
                  ": is another agent running?");
    HttpServer elsewhere(router);
    EXPECT_EQ(reasonOf(elsewhere.start({"203.0.113.1", 0}, ApiToken(secret))),
              "cannot listen on 203.0.113.1:0");
}

TEST_F(HttpServerTest, StopAnswersRequestsInProgressAndClosesIdleConnections) {
    TestClient idle("127.0.0.1", server.port());
    EXPECT_EQ(idle.get("/healthz")->status, 200);
    std::promise<void> begun;
    source.onTake = [&](auto, auto) {
        begun.set_value();
        std::this_thread::sleep_for(50ms);
        return SampleSource::Rows{"[]", 0, false};
    };
    auto answer = std::async(std::launch::async, [this] {
        const auto result = sample("RMMONLOG", "{}");
        return result ? result->status : 0;
    });
    begun.get_future().wait();
    const auto begin = Clock::now();
    server.stop(begin + 30s);
    EXPECT_LT(Clock::now() - begin, 10s);
    EXPECT_EQ(answer.get(), 200);
    EXPECT_FALSE(client().get("/healthz"));
    server.stop(Clock::now());
}

TEST_F(HttpServerTest, StopDoesNotWaitForAClientThatNeverEndsItsRequest) {
    const int fd = TestClient::connected(server.port());
    std::atomic<bool> isOver{false};
    std::thread slow([&] {
        const std::string request = "GET /healthz HTTP/1.1\r\nX-Slow: ";
        send(fd, request.data(), request.size(), MSG_NOSIGNAL);
        while (!isOver) {
            send(fd, "x", 1, MSG_NOSIGNAL);
            std::this_thread::sleep_for(10ms);
        }
        close(fd);
    });
    // Another request, so that the slow one is being served by now.
    EXPECT_EQ(client().get("/healthz")->status, 200);
    const auto begin = Clock::now();
    server.stop(begin + 30s);
    EXPECT_LT(Clock::now() - begin, 10s);
    isOver = true;
    slow.join();
}

TEST_F(HttpServerTest, LeavesSignalActionsUnchanged) {
    std::signal(SIGPIPE, SIG_DFL);
    { HttpServer another(router); }
    EXPECT_EQ(std::signal(SIGPIPE, SIG_IGN), SIG_DFL);
}

TEST_F(HttpServerTest, AbandonWaitsForSamplesUpToTheLimitAndStartsNoMore) {
    std::promise<void> begun;
    std::promise<void> go;
    std::shared_future<void> mayGo = go.get_future().share();
    source.onTake = [&](auto, auto) {
        begun.set_value();
        mayGo.wait();
        return SampleSource::Rows{"[]", 0, false};
    };
    auto answer = std::async(std::launch::async, [this] {
        const auto result = sample("RMMONLOG", "{}");
        return result ? result->status : 0;
    });
    begun.get_future().wait();
    const auto begin = Clock::now();
    server.abandon(begin + 30ms);
    EXPECT_GE(Clock::now() - begin, 30ms) << "the sample is in progress";
    expectProblem(sample("RMMONLOG", "{}"), 503, "the agent is stopping", "");
    go.set_value();
    EXPECT_EQ(answer.get(), 200);
    server.abandon(Clock::now() + 10s); // nothing is in progress: returns at once
}

TEST_F(HttpServerTest, ASampleMayEndTheProcess) {
    bool hasReturned = false;
    source.onTake = [&](auto, auto) {
        const auto begin = Clock::now();
        server.abandon(begin + 10s); // as the process's exit routine does, on this thread
        hasReturned = Clock::now() - begin < 5s;
        return SampleSource::Rows{"[]", 0, false};
    };
    EXPECT_EQ(sample("RMMONLOG", "{}")->status, 200);
    EXPECT_TRUE(hasReturned);
}

TEST(HttpServerLife, ListensOnIpv6AndByName) {
    Router router;
    HealthResource().addRoutes(router);
    RecordingTrace trace(0);
    for (const char* const host : {"::1", "localhost"}) {
        HttpServer server(router);
        ASSERT_EQ(reasonOf(server.start({host, 0}, ApiToken(secret))), "");
        TestClient client(host, server.port());
        const auto result = client.get("/healthz");
        ASSERT_TRUE(result) << host;
        EXPECT_EQ(result->status, 200) << host;
    }
}

} // namespace
