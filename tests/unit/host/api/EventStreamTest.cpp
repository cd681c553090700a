#include "host/api/EventStream.h"

#include "support/RecordingTrace.h"
#include "unit/host/api/TestHistory.h"
#include "unit/host/http/TestRouter.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <condition_variable>
#include <functional>
#include <memory>
#include <mutex>
#include <string>
#include <thread>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;

/// A client of a stream, which by default takes everything at once.
class Client {
public:
    explicit Client(const HttpAnswer& answer, bool takesAll = true)
        : m_channel(std::make_shared<Channel>(answer.stream.changed, takesAll)) {
        answer.stream.begin(m_channel);
    }
    ~Client() { leave(); }
    /// Waits until the text received so far ends with this one.
    bool gets(const std::string& end) {
        return m_channel->waitFor([&] { return m_channel->text.ends_with(end); });
    }
    std::string text() {
        std::string copy;
        m_channel->waitFor([&] {
            copy = m_channel->text;
            return true;
        });
        return copy;
    }
    void takeAll() {
        m_channel->set([](Channel& channel) { channel.isReadyNow = true; });
    }
    void leave() {
        m_channel->set([](Channel& channel) { channel.isOpenNow = false; });
    }
    bool isEnded() {
        return m_channel->waitFor([&] { return m_channel->isEnded; });
    }

private:
    struct Channel : BodyChannel {
        Channel(std::function<void()> whenChanged, bool takesAllAtOnce)
            : isReadyNow(takesAllAtOnce), m_whenChanged(std::move(whenChanged)) {}
        void send(std::string part) override {
            const std::lock_guard guard(mutex);
            text += part;
            changed.notify_all();
        }
        bool isReady() const override {
            const std::lock_guard guard(mutex);
            return isOpenNow && isReadyNow;
        }
        bool isOpen() const override {
            const std::lock_guard guard(mutex);
            return isOpenNow;
        }
        void end() override {
            const std::lock_guard guard(mutex);
            isEnded = true;
            changed.notify_all();
        }
        bool waitFor(const std::function<bool()>& condition) {
            std::unique_lock lock(mutex);
            return changed.wait_for(lock, 20s, condition);
        }
        template <class Change> void set(Change change) {
            {
                const std::lock_guard guard(mutex);
                change(*this);
            }
            m_whenChanged();
        }
        mutable std::mutex mutex;
        std::condition_variable changed;
        std::string text;
        bool isReadyNow;
        bool isOpenNow = true;
        bool isEnded = false;

    private:
        const std::function<void()> m_whenChanged;
    };
    std::shared_ptr<Channel> m_channel;
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

    bool hasNoClients() const {
        for (int count = 0; count < 2000 && stream.clients() > 0; ++count) {
            std::this_thread::sleep_for(10ms);
        }
        return stream.clients() == 0;
    }

    RecordingTrace trace{0};
    TestHistory history;
    EventStream stream{&history};
    TestRouter router{stream};
};

TEST_F(EventStreamTest, SendsOnlyNewEvents) {
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
}

TEST_F(EventStreamTest, ContinuesAfterTheClientsLastEvent) {
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
    }
    // Ids beyond the newest belong to a history that no longer exists.
    Client beyond(open("?after=100000"));
    EXPECT_TRUE(beyond.gets("retry: 2000\n\n"));
    history.add(501);
    EXPECT_TRUE(beyond.gets(message(501)));
}

TEST_F(EventStreamTest, SendsOnlyTheRequestedKinds) {
    Client client(open("?situation=a&situation=b"));
    EXPECT_TRUE(client.gets("retry: 2000\n\n"));
    history.add(1, "c");
    history.add(2, "a");
    history.add(3, "c");
    history.add(4, "b");
    EXPECT_TRUE(client.gets(message(4)));
    EXPECT_EQ(client.text(), "retry: 2000\n\n" + message(2) + message(4));
}

TEST_F(EventStreamTest, SendsKeepAlives) {
    EventStream often(&history, 20ms);
    const TestRouter asked(often);
    Client client(asked.ask("GET", "/api/v1/events/stream"));
    EXPECT_TRUE(client.gets(": keep-alive\n\n: keep-alive\n\n"));
}

TEST_F(EventStreamTest, EndsWhenTheClientHasGone) {
    Client client(open());
    EXPECT_TRUE(client.gets("retry: 2000\n\n"));
    EXPECT_EQ(stream.clients(), 1u);
    client.leave();
    EXPECT_TRUE(hasNoClients());
    // A later client is served by a new thread.
    Client another(open());
    EXPECT_TRUE(another.gets("retry: 2000\n\n"));
    history.add(1);
    EXPECT_TRUE(another.gets(message(1)));
}

TEST_F(EventStreamTest, AClientThatIsNotReadyGetsNothingAndDelaysNobody) {
    Client slow(open(), false);
    Client quick(open());
    for (int id = 1; id <= 3; ++id) {
        history.add(static_cast<std::uint64_t>(id));
        EXPECT_TRUE(quick.gets(message(id)));
    }
    EXPECT_EQ(slow.text(), "retry: 2000\n\n");
    slow.takeAll();
    EXPECT_TRUE(slow.gets(message(1) + message(2) + message(3)));
}

TEST_F(EventStreamTest, AStreamThatCannotReadTheHistoryEndsAlone) {
    trace.setLevel(TRC1_ERROR);
    Client client(open());
    history.fail();
    history.add(1);
    EXPECT_TRUE(client.isEnded());
    EXPECT_TRUE(hasNoClients());
    EXPECT_THAT(trace.messages(), testing::ElementsAre("A stream broke off: disk I/O error"));
}

TEST_F(EventStreamTest, TheEndOfTheResourceEndsEveryStream) {
    auto other = std::make_unique<EventStream>(&history);
    const HttpAnswer answer = TestRouter(*other).ask("GET", "/api/v1/events/stream");
    const HttpAnswer late = TestRouter(*other).ask("GET", "/api/v1/events/stream");
    Client client(answer);
    EXPECT_TRUE(client.gets("retry: 2000\n\n"));
    other.reset();
    EXPECT_TRUE(client.isEnded());
    Client tooLate(late);
    EXPECT_TRUE(tooLate.isEnded());
}

TEST_F(EventStreamTest, LimitsTheNumberOfClients) {
    {
        std::vector<HttpAnswer> answers;
        for (std::size_t count = 0; count < EventStream::mostClients; ++count) {
            answers.push_back(open());
            EXPECT_EQ(answers.back().status, 200);
        }
        const HttpAnswer refused = open();
        EXPECT_EQ(refused.status, 503);
        EXPECT_EQ(refused.body, ": too many clients are following the events: at most 32");
        EXPECT_EQ(stream.clients(), EventStream::mostClients);
    }
    EXPECT_EQ(stream.clients(), 0u);
    EXPECT_EQ(open().status, 200);
}

TEST_F(EventStreamTest, RefusesInvalidRequests) {
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
