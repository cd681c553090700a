#include "host/cli/EventFollower.h"

#include "TestAgent.h"
#include "host/cli/CliError.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <csignal>
#include <memory>
#include <mutex>
#include <string>
#include <thread>
#include <vector>

#include <nlohmann/json.hpp>

#include <unistd.h>

using namespace zrm::host;

using testing::ElementsAre;

namespace {

/// An agent whose stream sends what a test has scripted for each connection and then ends it, or
/// stays silent after the last. The operator presses Ctrl-C when the last event has arrived.
class EventFollowerTest : public testing::Test {
protected:
    struct Part {
        std::string text;
        int status = 200;
    };

    /// The server's threads leave the signal to the follower, too.
    void SetUp() override {
        sigset_t signals;
        sigemptyset(&signals);
        sigaddset(&signals, SIGINT);
        pthread_sigmask(SIG_BLOCK, &signals, &before);
    }
    void TearDown() override {
        agent.end();
        pthread_sigmask(SIG_SETMASK, &before, nullptr);
    }

    void addRoutes() {
        agent.routes().add("GET", "/api/v1/events", [this](const HttpRequest&) {
            return HttpAnswer::json("{\"events\":[],\"newest\":" + std::to_string(newest) + "}");
        });
        agent.routes().add("GET", "/api/v1/events/stream",
                           [this](const HttpRequest& request) { return stream(request); });
    }

    static std::string parameter(const HttpRequest& request, const std::string& name) {
        const auto found = request.query.find(name);
        return found == request.query.end() ? "" : found->second;
    }

    HttpAnswer stream(const HttpRequest& request) {
        const std::lock_guard guard(mutex);
        asked.push_back(parameter(request, "after"));
        situations.push_back(parameter(request, "situation"));
        const std::size_t number = asked.size() - 1;
        if (number < parts.size() && parts[number].status != 200) {
            return {parts[number].status, "application/problem+json", parts[number].text};
        }
        const bool isLast = number + 1 >= parts.size();
        const std::string text = number < parts.size() ? parts[number].text : "";
        HttpAnswer answer;
        answer.contentType = "text/event-stream";
        answer.stream.begin = [text, isLast](const std::shared_ptr<BodyChannel>& channel) {
            channel->send(text);
            if (!isLast) {
                channel->end();
            }
        };
        return answer;
    }

    std::vector<std::uint64_t> follow(std::uint64_t after, std::uint64_t lastEvent) {
        StopSignals signals;
        AgentClient client(agent.connection());
        EventFollower follower(client, {{"situation", "a b"}}, signals,
                               [this](const std::string& text) { notes.push_back(text); });
        std::vector<std::uint64_t> ids;
        follower.follow(after, [&](const auto& event) {
            ids.push_back(event["id"]);
            ++received;
            if (ids.back() == lastEvent) {
                kill(getpid(), SIGINT);
            }
        });
        return ids;
    }

    /// What the server's threads have recorded.
    std::vector<std::string> copy(const std::vector<std::string>& texts) {
        const std::lock_guard guard(mutex);
        return texts;
    }

    static std::string event(int id) {
        const std::string number = std::to_string(id);
        return "id: " + number + "\nevent: event\ndata: {\"id\":" + number + "}\n\n";
    }

    sigset_t before{};
    TestAgent agent;
    std::vector<Part> parts;
    std::uint64_t newest = 100;
    std::mutex mutex;
    std::vector<std::string> asked;
    std::vector<std::string> situations;
    std::vector<std::string> notes;
    std::atomic<int> received{0}; ///< events
};

const std::string lost = "the connection to the agent was lost; reconnecting";

} // namespace

TEST_F(EventFollowerTest, DeliversEventsUntilCtrlC) {
    parts = {{event(8) + ": keep-alive\n\n" + event(9)}};
    addRoutes();
    agent.begin();
    EXPECT_THAT(follow(7, 9), ElementsAre(8, 9));
    EXPECT_THAT(copy(asked), ElementsAre("7"));
    EXPECT_THAT(copy(situations), ElementsAre("a b"));
    EXPECT_THAT(notes, ElementsAre());
}

TEST_F(EventFollowerTest, AfterALostConnectionItContinuesAfterTheLastWholeEvent) {
    parts = {
        {event(8) + event(9) + "id: 10\ndata: {\"id\":1"}, {event(9) + event(10)}, {event(11)}};
    addRoutes();
    agent.begin();
    EXPECT_THAT(follow(7, 11), ElementsAre(8, 9, 10, 11));
    EXPECT_THAT(copy(asked), ElementsAre("7", "9", "10"));
    EXPECT_THAT(notes, ElementsAre(lost, "reconnected", lost, "reconnected"));
}

TEST_F(EventFollowerTest, ANewHistoryIsFollowedFromItsFirstEvent) {
    newest = 2;
    parts = {{event(500)}, {event(1) + event(2)}};
    addRoutes();
    agent.begin();
    EXPECT_THAT(follow(499, 2), ElementsAre(500, 1, 2));
    EXPECT_THAT(copy(asked), ElementsAre("499", "0"));
    EXPECT_THAT(notes,
                ElementsAre(lost,
                            "the agent has started a new history; its events follow from the first",
                            "reconnected"));
}

TEST_F(EventFollowerTest, ARefusalEndsTheFollowing) {
    parts = {{R"({"detail":"the history is off"})", 409}};
    addRoutes();
    agent.begin();
    try {
        follow(0, 1);
        FAIL() << "no error";
    } catch (const CliError& error) {
        EXPECT_EQ(error.status(), CliStatus::REFUSED);
        EXPECT_STREQ(error.what(), "the history is off");
    }
}

TEST_F(EventFollowerTest, FollowingContinuesAfterTheAgentRestarts) {
    parts = {{event(8)}, {event(9)}};
    addRoutes();
    agent.begin();
    std::thread restart([this] {
        while (received == 0) { // what is being sent when the agent ends may not arrive
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
        agent.end();
        addRoutes();
        agent.begin();
    });
    EXPECT_THAT(follow(7, 9), ElementsAre(8, 9));
    restart.join();
    EXPECT_THAT(notes, ElementsAre(lost, "reconnected"));
}
