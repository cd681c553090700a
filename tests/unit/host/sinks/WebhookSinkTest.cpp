#include "host/sinks/WebhookSink.h"

#include "ScriptedServer.h"
#include "SinkTest.h"
#include "support/RecordingTrace.h"
#include "support/TemporaryDirectory.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <string>
#include <vector>

#include <sys/stat.h>

using namespace zrm::host;

namespace {

using Reply = ScriptedServer::Reply;
using Request = ScriptedServer::Request;
using testing::ElementsAre;

class WebhookSinkTest : public testing::Test {
protected:
    WebhookSinkTest() {
        for (const char* const text : {"one", "two", "three", "four", "five"}) {
            events.add({.description = text});
        }
    }
    SinkConfig config(const std::string& keys = "") const {
        return sinkConfig("type = 'webhook'\nurl = '" + receiver.url("/hook") + "'\n" + keys);
    }
    std::span<const EventRecord> from(std::size_t first) const {
        return std::span(events.records()).subspan(first);
    }
    /// The body with the events from the first to the last, counted from 1.
    std::string body(std::size_t first, std::size_t last) const {
        std::string text = "{\"events\":[";
        for (std::size_t id = first; id <= last; ++id) {
            text +=
                std::string(id == first ? "" : ",") + std::string(events.records()[id - 1].json);
        }
        return text + "]}";
    }

    RecordingTrace trace{0};
    TemporaryDirectory directory;
    EntryEvents events;
    std::vector<int> statuses; ///< of the next answers; 200 when there are none
    ScriptedServer receiver{[this](const Request&) {
        int status = 200;
        if (!statuses.empty()) {
            status = statuses.front();
            statuses.erase(statuses.begin());
        }
        return ScriptedServer::status(status);
    }};
    std::stop_source giveUp;
};

TEST_F(WebhookSinkTest, PostsEventsInBatchesAndInOrder) {
    WebhookSink sink(config("batch = 2"));
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 5u);
    EXPECT_THAT(receiver.bodies(), ElementsAre(body(1, 2), body(3, 4), body(5, 5)));
    const std::vector<Request> requests = receiver.requests();
    EXPECT_EQ(requests[0].line, "POST /hook HTTP/1.1");
    EXPECT_EQ(requests[0].header("idempotency-key"), "1-2-1795158189412");
    EXPECT_EQ(requests[2].header("idempotency-key"), "5-5-1795158193412");
    EXPECT_EQ(requests[0].header("x-zrm-signature"), "");
}

TEST_F(WebhookSinkTest, IsNamedAfterItsHostOrByTheFile) {
    const WebhookSink host(config());
    EXPECT_EQ(host.name(), "webhook 127.0.0.1:" + std::to_string(receiver.port()));
    const WebhookSink named(config("name = 'hook'"));
    EXPECT_EQ(named.name(), "hook");
}

TEST_F(WebhookSinkTest, AFailureSaysHowFarItGot) {
    receiver.set(statuses, std::vector<int>{200, 404});
    WebhookSink sink(config("batch = 2"));
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 2u);
    EXPECT_EQ(sink.error(),
              "127.0.0.1:" + std::to_string(receiver.port()) + " answered with status 404");
    EXPECT_EQ(sink.deliver(from(2), giveUp.get_token()), 3u);
    EXPECT_THAT(receiver.bodies(), ElementsAre(body(1, 2), body(3, 4), body(3, 4), body(5, 5)));
}

TEST_F(WebhookSinkTest, AFailedRequestIsRepeatedUnchanged) {
    receiver.set(statuses, std::vector<int>{500});
    WebhookSink sink(config());
    EXPECT_EQ(sink.deliver(from(0).first(2), giveUp.get_token()), 0u);
    // More events have arrived by now; the receiver may still have got the first request.
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 5u);
    EXPECT_THAT(receiver.bodies(), ElementsAre(body(1, 2), body(1, 2), body(3, 5)));
    const std::vector<Request> requests = receiver.requests();
    EXPECT_EQ(requests[0].header("idempotency-key"), requests[1].header("idempotency-key"));
}

TEST_F(WebhookSinkTest, SignsTheBodyWithASecret) {
    WebhookSink sink(config("secret = 'key'"));
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 5u);
    EXPECT_EQ(receiver.requests().at(0).header("x-zrm-signature"),
              "sha256=" + HmacSha256::hex("key", body(1, 5)));
}

TEST_F(WebhookSinkTest, RereadsTheSecretForEachRequest) {
    const std::string path = directory.file("secret");
    WebhookSink sink(config("secret_file = '" + path + "'"));
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 0u);
    EXPECT_EQ(sink.error(), "cannot read " + path + ": No such file or directory");
    for (const char* const empty : {"", "\n"}) {
        chmod(directory.write("secret", empty).c_str(), 0600);
        EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 0u);
        EXPECT_EQ(sink.error(), path + " is not a file with a secret of 1 to 4096 bytes");
    }
    EXPECT_TRUE(receiver.requests().empty()) << "nothing is sent unsigned";
    for (const char* const secret : {"first", "second key"}) {
        directory.write("secret", std::string(secret) + "\n");
        EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 5u);
        EXPECT_EQ(receiver.requests().back().header("x-zrm-signature"),
                  "sha256=" + HmacSha256::hex(secret, body(1, 5)));
    }
}

TEST_F(WebhookSinkTest, ASecretIsARegularFileOfBoundedSize) {
    chmod(directory.write("long", std::string(4097, 'a')).c_str(), 0600);
    for (const std::string& path : {std::string(directory.path()), directory.file("long")}) {
        WebhookSink sink(config("secret_file = '" + path + "'"));
        EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 0u);
        EXPECT_EQ(sink.error(), path + " is not a file with a secret of 1 to 4096 bytes");
    }
    chmod(directory.write("longest", std::string(4096, 'a') + "\n").c_str(), 0600);
    WebhookSink sink(config("secret_file = '" + directory.file("longest") + "'"));
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 5u);
}

TEST_F(WebhookSinkTest, ASecretThatEveryUserCanReadIsNotUsed) {
    const std::string path = directory.write("secret", "key\n");
    chmod(path.c_str(), 0644);
    WebhookSink sink(config("secret_file = '" + path + "'"));
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 0u);
    EXPECT_EQ(sink.error(),
              path +
                  " is accessible to every user: remove the permissions of other users (chmod o= " +
                  path + ")");
    chmod(path.c_str(), 0640);
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 5u);
}

TEST_F(WebhookSinkTest, RereadsTheHeadersFileForEachRequest) {
    const std::string path =
        directory.write("headers", "# for the gateway\nAuthorization: Bearer a:b\n\n X-One:1 \n");
    chmod(path.c_str(), 0600);
    WebhookSink sink(config("headers = { X-Two = '2' }\nheaders_file = '" + path + "'"));
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 5u);
    EXPECT_EQ(receiver.requests().back().header("authorization"), "bearer a:b");
    EXPECT_EQ(receiver.requests().back().header("x-one"), "1");
    EXPECT_EQ(receiver.requests().back().header("x-two"), "2");
    for (const char* const wrong : {"Host: x", "no colon", ": x", "X-One: \x01"}) {
        directory.write("headers", std::string("X-Three: 3\n") + wrong + "\n");
        EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 0u) << wrong;
        EXPECT_EQ(sink.error(), path + ":2: not a header that can be added; write 'Name: value', a "
                                       "line each");
    }
    directory.write("headers", "Authorization: other\n");
    EXPECT_EQ(sink.deliver(from(0), giveUp.get_token()), 5u);
    EXPECT_EQ(receiver.requests().back().header("authorization"), "other");
}

TEST(HmacSha256, GivesTheKnownSignatures) {
    // RFC 4231, test cases 1, 2 and 6.
    EXPECT_EQ(HmacSha256::hex(std::string(20, '\x0b'), "Hi There"),
              "b0344c61d8db38535ca8afceaf0bf12b881dc200c9833da726e9376c2e32cff7");
    EXPECT_EQ(HmacSha256::hex("Jefe", "what do ya want for nothing?"),
              "5bdcc146bf60754e6a042426089575c75a003f089d2739839dec58b964ec3843");
    EXPECT_EQ(HmacSha256::hex(std::string(131, '\xaa'),
                              "Test Using Larger Than Block-Size Key - Hash Key First"),
              "60e431591ee0b67f0d8a26aacbf5b77f8e0bc6213728c5140546040f0ee37f54");
}

} // namespace
