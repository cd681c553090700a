#include "host/cli/AgentClient.h"

#include "../sinks/ScriptedServer.h"
#include "TestAgent.h"
#include "host/cli/CliError.h"
#include "host/cli/EventFollower.h"

#include <gtest/gtest.h>

#include <functional>
#include <memory>
#include <mutex>
#include <utility>

#include <nlohmann/json.hpp>

using namespace zrm::host;

namespace {

void expectError(const std::function<void()>& action, CliStatus status, const std::string& text) {
    try {
        action();
        FAIL() << "no error";
    } catch (const CliError& error) {
        EXPECT_EQ(error.status(), status);
        EXPECT_EQ(std::string(error.what()), text);
    }
}

class AgentClientTest : public testing::Test {
protected:
    void answer(int status, const std::string& body) {
        agent.routes().add("GET", "/x", [=](const HttpRequest&) {
            return HttpAnswer{status, "application/json", body};
        });
        agent.begin();
        url = agent.connection().url;
    }
    void expectAnswer(CliStatus status, const std::string& text) {
        AgentClient client(agent.connection());
        expectError([&] { client.get("/x"); }, status, text);
    }

    TestAgent agent;
    std::string url;
};

} // namespace

TEST_F(AgentClientTest, SendsTokenQueryAndBody) {
    std::mutex mutex; // the server answers on any of its threads
    HttpRequest last;
    const auto see = [&](const HttpRequest& request) {
        const std::lock_guard guard(mutex);
        last = request;
        return HttpAnswer::json(R"({"b":1,"a":2})");
    };
    const auto seen = [&] {
        const std::lock_guard guard(mutex);
        return last;
    };
    agent.routes().add("GET", "/events", see);
    agent.routes().add("PUT", "/trace", see);
    agent.begin();
    AgentClient client(agent.connection());
    const auto got = client.get("/events", {{"log", "/var/log/a b&c=d+e.log"}, {"log", "/x"}});
    EXPECT_EQ(got.dump(), R"({"b":1,"a":2})") << "only requests with the token are answered";
    EXPECT_EQ(seen().query.count("log"), 2u);
    EXPECT_EQ(seen().query.find("log")->second, "/var/log/a b&c=d+e.log");
    client.send("PUT", "/trace", {{"levels", "error"}});
    EXPECT_EQ(seen().body, R"({"levels":"error"})");
}

TEST_F(AgentClientTest, AnAnswerWithoutABodyIsNull) {
    agent.routes().add("DELETE", "/x", [](const HttpRequest&) { return HttpAnswer{204, "", ""}; });
    agent.begin();
    AgentClient client(agent.connection());
    EXPECT_TRUE(client.send("DELETE", "/x", nullptr).is_null());
}

TEST_F(AgentClientTest, AProblemIsReportedWithItsField) {
    answer(400, R"({"status":400,"detail":"'is' is not an operator","field":"where[0]"})");
    expectAnswer(CliStatus::REFUSED, "where[0]: 'is' is not an operator");
}

TEST_F(AgentClientTest, AProblemWithoutAField) {
    answer(409, R"({"status":409,"detail":"the history is off"})");
    expectAnswer(CliStatus::REFUSED, "the history is off");
}

TEST_F(AgentClientTest, AnErrorWithoutAProblemDocumentIsReported) {
    answer(502, "<html>");
    expectAnswer(CliStatus::REFUSED, "the agent at " + url + " answered with status 502");
}

TEST_F(AgentClientTest, ARejectedTokenIsReported) {
    answer(401, "{}");
    expectAnswer(CliStatus::FORBIDDEN,
                 "the agent at " + url +
                     " does not accept the token from its file: give the right one "
                     "with --token-file or --config");
}

TEST_F(AgentClientTest, AnotherProgramAtTheAddressIsReported) {
    answer(200, "<html>");
    expectAnswer(CliStatus::UNREACHABLE,
                 "what answers at " + url + " is not a zrmagent: its answer is not a JSON object");
}

TEST_F(AgentClientTest, AnAgentThatIsNotRunningIsReported) {
    agent.begin();
    url = agent.connection().url;
    agent.end();
    expectAnswer(CliStatus::UNREACHABLE,
                 "cannot reach the agent at " + url +
                     ": is zrmagent running? (systemctl status zrmagent; another "
                     "address: --url or --config)");
}

TEST_F(AgentClientTest, AnEndlessAnswerIsReportedAndTakesBoundedMemory) {
    const ScriptedServer server([](const ScriptedServer::Request&) {
        return ScriptedServer::Reply{"HTTP/1.1 400 Bad\r\nTransfer-Encoding: chunked\r\n\r\n",
                                     ScriptedServer::Reply::KEEP, "4\r\nmore\r\n"};
    });
    AgentClient client({server.url(), "the-token", "its file"});
    expectError([&] { client.get("/x"); }, CliStatus::UNREACHABLE,
                "what answers at " + server.url() + " is not a zrmagent: its answer does not end");
}

TEST_F(AgentClientTest, ADeeplyNestedAnswerIsReported) {
    answer(200, R"({"a":)" + std::string(1'000'000, '[') + std::string(1'000'000, ']') + '}');
    expectAnswer(CliStatus::UNREACHABLE,
                 "what answers at " + url + " is not a zrmagent: its answer is not a JSON object");
}

TEST_F(AgentClientTest, AnEndlessEventOfAStreamIsReported) {
    const ScriptedServer server([](const ScriptedServer::Request&) {
        return ScriptedServer::Reply{"HTTP/1.1 200 OK\r\n\r\ndata: ", ScriptedServer::Reply::KEEP,
                                     std::string(4096, 'x')};
    });
    AgentClient client({server.url(), "the-token", "its file"});
    SseParser parser([](const std::string&) {});
    expectError(
        [&] { client.stream("/x", {}, [&](std::string_view piece) { parser.take(piece); }); },
        CliStatus::UNREACHABLE,
        "what answers is not a zrmagent: an event of its stream is longer than 1 MB");
}

TEST_F(AgentClientTest, AStreamThatBeginsAfterStopEnds) {
    std::shared_ptr<BodyChannel> stream; // without end
    agent.routes().add("GET", "/stream", [&](const HttpRequest&) {
        HttpAnswer answer;
        answer.contentType = "text/event-stream";
        answer.stream.begin = [&](std::shared_ptr<BodyChannel> channel) {
            stream = std::move(channel);
            stream->send("more");
        };
        return answer;
    });
    agent.begin();
    AgentClient client(agent.connection());
    client.stop();
    int pieces = 0;
    client.stream("/stream", {}, [&](std::string_view) { ++pieces; });
    EXPECT_EQ(pieces, 0);
}

namespace {

/// The sum of the numbers in the lines of an answer in chunks; an error's text ends it.
std::string linesOf(const std::string& body) {
    const ScriptedServer server([&](const ScriptedServer::Request&) {
        return ScriptedServer::Reply{"HTTP/1.1 200 OK\r\nConnection: close\r\n\r\n" + body,
                                     ScriptedServer::Reply::CLOSE};
    });
    AgentClient client({server.url(), "the-token", "its file"});
    std::string result;
    try {
        client.lines("/x", {{"a", 1}}, "end",
                     [&](AgentClient::Json&& line) { result += line.dump() + ' '; });
    } catch (const CliError& error) {
        const std::string text = error.what();
        EXPECT_EQ(error.status(), CliStatus::UNREACHABLE);
        return result + text.substr(text.find(server.url()) + server.url().size());
    }
    return result;
}

} // namespace

TEST_F(AgentClientTest, PassesOnTheLinesOfAnAnswer) {
    EXPECT_EQ(linesOf("{\"row\":1}\n{\"end\":2}\n"), R"({"row":1} {"end":2} )");
}

TEST_F(AgentClientTest, AnAnswerInLinesWithoutItsEndIsReported) {
    EXPECT_EQ(linesOf("{\"row\":1}\n{\"end\":"), R"({"row":1}  ended before the answer did)");
    EXPECT_EQ(linesOf("7\n"), " is not a zrmagent: its answer is not JSON objects");
    EXPECT_EQ(linesOf(std::string(1'100'000, 'x')), " is not a zrmagent: its answer does not end");
}

TEST_F(AgentClientTest, AProblemInPlaceOfLinesIsReported) {
    agent.routes().add("POST", "/x", [](const HttpRequest&) {
        return HttpAnswer{404, "application/problem+json", R"({"detail":"no such log"})"};
    });
    agent.begin();
    AgentClient client(agent.connection());
    expectError(
        [&] {
            client.lines("/x", {{"a", 1}}, "end", [](AgentClient::Json&&) {});
        },
        CliStatus::REFUSED, "no such log");
}
