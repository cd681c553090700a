#include "host/sinks/Connection.h"

#include "LocalSocket.h"
#include "support/FakeResolver.h"
#include "support/RecordingTrace.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <chrono>
#include <string>

#include <sys/socket.h>
#include <unistd.h>

using namespace zrm::host;

namespace {

using namespace std::chrono_literals;

class ConnectionTest : public testing::Test {
protected:
    RecordingTrace trace{0};
    std::stop_source giveUp;
};

TEST_F(ConnectionTest, AfterAFailureOverUdpTheSocketIsOpenedAgain) {
    std::uint16_t port = 0;
    close(localSocket(SOCK_DGRAM, port)); // nobody uses the port now
    Connection connection(ListenAddress{"127.0.0.1", port}, Connection::UDP, 1s);
    ASSERT_TRUE(connection.open(giveUp.get_token()));
    int sent = 0;
    while (connection.send("text", giveUp.get_token())) {
        ASSERT_LT(++sent, 1000);
    }
    EXPECT_EQ(connection.error(),
              "send failed: Connection refused (127.0.0.1:" + std::to_string(port) + ")");
    EXPECT_FALSE(connection.isOpen())
        << "this machine may no longer have the address it is bound to";
}

TEST_F(ConnectionTest, ASlowLookupEndsInTime) {
    FakeResolver resolver("127.0.0.1");
    std::uint16_t port = 0;
    const int listener = localSocket(SOCK_STREAM, port);
    listen(listener, 1);
    Connection connection(ListenAddress{"slow.example", port}, Connection::TCP, 50ms);
    EXPECT_FALSE(connection.open(giveUp.get_token()));
    const std::string place = "slow.example:" + std::to_string(port);
    EXPECT_EQ(connection.error(), place + " is not known: the system is still looking its name up");
    resolver.answer();
    while (!connection.open(giveUp.get_token())) {
        ASSERT_THAT(connection.error(), testing::HasSubstr("still looking"));
    }
    close(listener);
    Connection other(ListenAddress{"slow.example", port}, Connection::TCP, 60s);
    giveUp.request_stop();
    EXPECT_FALSE(other.open(giveUp.get_token()));
    EXPECT_EQ(other.error(), "the agent is stopping (" + place + ")");
}

} // namespace
