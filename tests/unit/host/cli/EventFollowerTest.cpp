#include "host/cli/EventFollower.h"

#include "TestAgent.h"
#include "host/cli/CliError.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <atomic>
#include <csignal>
#include <mutex>
#include <vector>

#include <nlohmann/json.hpp>

#include <unistd.h>

using testing::ElementsAre;

namespace {

using httplib::Request;
using httplib::Response;

/// An agent whose stream gives what a test has scripted for each connection, and then ends it, or
/// stays silent when that was the last. The operator presses Ctrl-C when the last event has come.
class EventFollowerTest : public testing::Test {
protected:
    struct Part {
        std::string text;
        int status = 200;
    };

    /// The threads of the server, too, leave the signal to the follower.
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
        agent.routes().Get("/api/v1/events", [this](const Request&, Response& response) {
            response.set_content("{\"events\":[],\"newest\":" + std::to_string(newest) + "}",
                                 "application/json");
        });
        agent.routes().Get(
            "/api/v1/events/stream",
            [this](const Request& request, Response& response) { stream(request, response); });
    }

    void stream(const Request& request, Response& response) {
        const std::lock_guard guard(mutex);
        asked.push_back(request.get_param_value("after"));
        situations.push_back(request.get_param_value("situation"));
        const std::size_t number = asked.size() - 1;
        if (number < parts.size() && parts[number].status != 200) {
            response.status = parts[number].status;
            response.set_content(parts[number].text, "application/problem+json");
            return;
        }
        const bool isLast = number + 1 >= parts.size();
        const std::string text = number < parts.size() ? parts[number].text : "";
        response.set_chunked_content_provider(
            "text/event-stream", [this, text, isLast](std::size_t, httplib::DataSink& sink) {
                sink.write(text.data(), text.size());
                while (isLast && !ends && sink.is_writable()) {
                    std::this_thread::sleep_for(std::chrono::milliseconds(5));
                }
                return false; // breaks the connection off
            });
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
        ends = true;
        return ids;
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
    std::atomic<bool> ends{false};
    std::atomic<int> received{0}; ///< events
};

const std::string lost = "the connection to the agent is lost; trying to connect again";

} // namespace

TEST_F(EventFollowerTest, GivesEventsUntilCtrlC) {
    parts = {{event(8) + ": keep-alive\n\n" + event(9)}};
    addRoutes();
    agent.begin();
    EXPECT_THAT(follow(7, 9), ElementsAre(8, 9));
    EXPECT_THAT(asked, ElementsAre("7"));
    EXPECT_THAT(situations, ElementsAre("a b"));
    EXPECT_THAT(notes, ElementsAre());
}

TEST_F(EventFollowerTest, AfterALostConnectionItGoesOnBehindTheLastWholeEvent) {
    parts = {
        {event(8) + event(9) + "id: 10\ndata: {\"id\":1"}, {event(9) + event(10)}, {event(11)}};
    addRoutes();
    agent.begin();
    EXPECT_THAT(follow(7, 11), ElementsAre(8, 9, 10, 11));
    EXPECT_THAT(asked, ElementsAre("7", "9", "10"));
    EXPECT_THAT(notes, ElementsAre(lost, "connected again", lost, "connected again"));
}

TEST_F(EventFollowerTest, AHistoryThatBeganAnewIsFollowedFromItsFirstEvent) {
    newest = 2;
    parts = {{event(500)}, {event(1) + event(2)}};
    addRoutes();
    agent.begin();
    EXPECT_THAT(follow(499, 2), ElementsAre(500, 1, 2));
    EXPECT_THAT(asked, ElementsAre("499", "0"));
    EXPECT_THAT(notes, ElementsAre(lost,
                                   "the agent has begun a new history; its events follow from the "
                                   "first",
                                   "connected again"));
}

TEST_F(EventFollowerTest, ARefusalEndsIt) {
    parts = {{R"({"detail":"the history is off"})", 409}};
    addRoutes();
    agent.begin();
    try {
        follow(0, 1);
        FAIL() << "no error";
    } catch (const CliError& error) {
        EXPECT_EQ(error.status(), CLI_REFUSED);
        EXPECT_STREQ(error.what(), "the history is off");
    }
}

TEST_F(EventFollowerTest, AnAgentThatIsStartedAgainIsFollowedFurther) {
    parts = {{event(8)}, {event(9)}};
    addRoutes();
    agent.begin();
    std::thread restart([this] {
        while (received == 0) { // what is on its way when the agent ends may not arrive
            std::this_thread::sleep_for(std::chrono::milliseconds(1));
        }
        agent.end();
        addRoutes();
        agent.begin();
    });
    EXPECT_THAT(follow(7, 9), ElementsAre(8, 9));
    restart.join();
    EXPECT_THAT(notes, ElementsAre(lost, "connected again"));
}
