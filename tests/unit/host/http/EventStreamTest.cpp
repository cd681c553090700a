#include "host/http/EventStream.h"

#include "support/RecordingTrace.h"
#include "unit/host/http/TestHistory.h"
#include "unit/host/http/TestRouter.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <condition_variable>
#include <functional>
#include <mutex>
#include <stop_token>
#include <string>
#include <thread>

namespace {

using namespace std::chrono_literals;

/// A client that follows a stream on a thread of its own.
class Client {
public:
    explicit Client(HttpAnswer answer) : m_answer(std::move(answer)) {
        m_thread = std::jthread([this](const std::stop_token& stop) {
            m_answer.stream(
                [this](std::string_view text) {
                    const std::lock_guard guard(m_mutex);
                    m_text += text;
                    m_changed.notify_all();
                    return !m_isGone;
                },
                stop);
            m_answer = {};
        });
    }
    /// Waits for the text that came so far to end with this one.
    bool gets(const std::string& end) {
        std::unique_lock lock(m_mutex);
        return m_changed.wait_for(lock, 20s, [&] { return m_text.ends_with(end); });
    }
    std::string text() {
        const std::lock_guard guard(m_mutex);
        return m_text;
    }
    void leave() {
        const std::lock_guard guard(m_mutex);
        m_isGone = true;
    }
    void stop() {
        m_thread.request_stop();
        m_thread.join();
    }
    void join() { m_thread.join(); }

private:
    HttpAnswer m_answer;
    std::mutex m_mutex;
    std::condition_variable m_changed;
    std::string m_text;
    bool m_isGone = false;
    std::jthread m_thread;
};

std::string message(int id) {
    return "id: " + std::to_string(id) + "\nevent: event\ndata: {\"id\":" + std::to_string(id) +
           "}\n\n";
}

class EventStreamTest : public testing::Test {
protected:
    HttpAnswer open(const std::string& query = "", const std::string& lastEventId = "") const {
        return router.ask("GET", "/api/v1/events/stream" + query, "", lastEventId);
    }

    RecordingTrace trace{0};
    TestHistory history;
    EventStream stream{&history};
    TestRouter router{stream};
};

TEST_F(EventStreamTest, GivesWhatIsNewFromNowOn) {
    history.add(1);
    const HttpAnswer answer = open();
    EXPECT_EQ(answer.status, 200);
    EXPECT_EQ(answer.contentType, "text/event-stream");
    Client client(answer);
    EXPECT_TRUE(client.gets("retry: 2000\n\n"));
    history.add(2);
    EXPECT_TRUE(client.gets(message(2)));
    history.add(3);
    EXPECT_TRUE(client.gets(message(3)));
    EXPECT_EQ(client.text(), "retry: 2000\n\n" + message(2) + message(3));
    client.stop();
}

TEST_F(EventStreamTest, GoesOnAfterTheLastEventOfTheClient) {
    for (std::uint64_t id = 1; id <= 500; ++id) {
        history.add(id);
    }
    std::string expected = "retry: 2000\n\n";
    for (int id = 3; id <= 500; ++id) {
        expected += message(id);
    }
    for (const HttpAnswer& answer : {open("?after=2"), open("?after=400", "2")}) {
        Client client(answer);
        EXPECT_TRUE(client.gets(message(500)));
        EXPECT_EQ(client.text(), expected);
        client.stop();
    }
    // Ids beyond the newest belong to a history that is no more.
    Client beyond(open("?after=100000"));
    EXPECT_TRUE(beyond.gets("retry: 2000\n\n"));
    history.add(501);
    EXPECT_TRUE(beyond.gets(message(501)));
    beyond.stop();
}

TEST_F(EventStreamTest, GivesTheKindsThatAreWanted) {
    Client client(open("?situation=a&situation=b"));
    EXPECT_TRUE(client.gets("retry: 2000\n\n"));
    history.add(1, "c");
    history.add(2, "a");
    history.add(3, "c");
    history.add(4, "b");
    EXPECT_TRUE(client.gets(message(4)));
    EXPECT_EQ(client.text(), "retry: 2000\n\n" + message(2) + message(4));
    client.stop();
}

TEST_F(EventStreamTest, TellsThatItIsAlive) {
    EventStream often(&history, 20ms);
    const TestRouter asked(often);
    Client client(asked.ask("GET", "/api/v1/events/stream"));
    EXPECT_TRUE(client.gets(": keep-alive\n\n: keep-alive\n\n"));
    client.stop();
}

TEST_F(EventStreamTest, EndsWhenTheClientHasGone) {
    Client client(open());
    EXPECT_TRUE(client.gets("retry: 2000\n\n"));
    EXPECT_EQ(stream.clients(), 1u);
    client.leave();
    client.join();
    EXPECT_EQ(stream.clients(), 0u);
}

TEST_F(EventStreamTest, TakesSoManyClientsAtATime) {
    {
        std::vector<HttpAnswer> answers;
        for (std::size_t count = 0; count < EventStream::mostClients; ++count) {
            answers.push_back(open());
            EXPECT_EQ(answers.back().status, 200);
        }
        const HttpAnswer refused = open();
        EXPECT_EQ(refused.status, 503);
        EXPECT_EQ(refused.body, ": too many clients follow the events: at most 32");
        EXPECT_EQ(stream.clients(), EventStream::mostClients);
    }
    EXPECT_EQ(stream.clients(), 0u);
    EXPECT_EQ(open().status, 200);
}

TEST_F(EventStreamTest, RefusesWhatMakesNoSense) {
    EXPECT_EQ(open("", "x").body, "Last-Event-ID: the id of an event is a whole number");
    EXPECT_EQ(open("?after=x").body, "after: write a whole number from 0 to 9223372036854775807");
    EXPECT_EQ(open("?limit=5").body.substr(0, 26), "limit: unknown parameter; ");
    EXPECT_EQ(stream.clients(), 0u);
    EventStream off(nullptr);
    const HttpAnswer answer = TestRouter(off).ask("GET", "/api/v1/events/stream");
    EXPECT_EQ(answer.status, 409);
    EXPECT_EQ(answer.body, ": the history is off");
}

} // namespace
