#include "host/http/ClientConnection.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <chrono>
#include <memory>
#include <string>
#include <thread>

#include <sys/socket.h>
#include <unistd.h>

namespace {

using namespace std::chrono_literals;
using Clock = std::chrono::steady_clock;

class ClientConnectionTest : public testing::Test {
protected:
    void SetUp() override {
        ASSERT_EQ(socketpair(AF_UNIX, SOCK_STREAM, 0, ends), 0);
        socket = std::make_unique<ClientSocket>(ends[0], stop);
        connection = std::make_unique<ClientConnection>(*socket);
    }
    void TearDown() override { hangUp(); }
    void send(const std::string& bytes) const {
        EXPECT_EQ(::send(ends[1], bytes.data(), bytes.size(), MSG_NOSIGNAL),
                  static_cast<ssize_t>(bytes.size()));
    }
    void hangUp() {
        if (ends[1] != -1) {
            close(ends[1]);
            ends[1] = -1;
        }
    }
    /// What is read until this many bytes are there, or no more come.
    std::string read(std::size_t size) const {
        std::string text;
        char bytes[7];
        while (text.size() < size) {
            const std::size_t count =
                connection->read(bytes, std::min(sizeof bytes, size - text.size()));
            if (count == 0) {
                break;
            }
            text.append(bytes, count);
        }
        return text;
    }

    int ends[2] = {-1, -1};
    StopSignal stop;
    std::unique_ptr<ClientSocket> socket;
    std::unique_ptr<ClientConnection> connection;
};

TEST_F(ClientConnectionTest, PassesOverEmptyLinesBeforeAHead) {
    std::string lines;
    for (int count = 0; count < 1000; ++count) {
        lines += "\r\n";
    }
    send(lines + "GET / HTTP/1.1\r\nrange: x\r\nHost: h\r\n\r\nbody");
    EXPECT_EQ(connection->readHead(20s), ClientConnection::COMPLETE);
    EXPECT_EQ(connection->head(), "GET / HTTP/1.1\r\nHost: h");
    EXPECT_EQ(read(30), "GET / HTTP/1.1\r\nHost: h\r\n\r\nbod");
}

TEST_F(ClientConnectionTest, GivesHeadsAndWhatFollowsThem) {
    send("GET / HTTP/1.1\r\nHost: x\r\n");
    std::thread later([this] {
        std::this_thread::sleep_for(10ms);
        send("A: b\r\n\r\nbodyPUT /x HTTP/1.1\r\n\r\n");
    });
    EXPECT_EQ(connection->readHead(20s), ClientConnection::COMPLETE);
    later.join();
    const std::string head = "GET / HTTP/1.1\r\nHost: x\r\nA: b\r\n\r\n";
    EXPECT_EQ(read(head.size()), head);
    EXPECT_EQ(read(4), "body");
    EXPECT_EQ(connection->readHead(20s), ClientConnection::COMPLETE);
    EXPECT_EQ(read(19), "PUT /x HTTP/1.1\r\n\r\n");
}

TEST_F(ClientConnectionTest, PassesOverLineEndsBetweenRequests) {
    send("\r\n\r\nGET / HTTP/1.1\r\n\r\n");
    EXPECT_EQ(connection->readHead(20s), ClientConnection::COMPLETE);
    EXPECT_EQ(read(18), "GET / HTTP/1.1\r\n\r\n");
}

TEST_F(ClientConnectionTest, LeavesRangesOut) {
    send(
        "GET / HTTP/1.1\r\nRange: bytes=0-1\r\nX-Range: a\r\nrANGE:b\r\nRanged: c\r\n\r\nRange: d");
    EXPECT_EQ(connection->readHead(20s), ClientConnection::COMPLETE);
    EXPECT_EQ(read(49), "GET / HTTP/1.1\r\nX-Range: a\r\nRanged: c\r\n\r\nRange: d");
}

TEST_F(ClientConnectionTest, BoundsHeads) {
    send("GET / HTTP/1.1\r\nA: " + std::string(ClientConnection::largestHead, 'x') + "\r\n\r\n");
    EXPECT_EQ(connection->readHead(20s), ClientConnection::TOO_LONG);
}

TEST_F(ClientConnectionTest, WaitsSoLongForARequest) {
    const auto begin = Clock::now();
    EXPECT_EQ(connection->readHead(30ms), ClientConnection::NONE);
    EXPECT_GE(Clock::now() - begin, 30ms);
    EXPECT_LT(Clock::now() - begin, 5s);
}

TEST_F(ClientConnectionTest, EndsWithItsClient) {
    send("GET / HT");
    hangUp();
    EXPECT_EQ(connection->readHead(20s), ClientConnection::NONE);
    EXPECT_TRUE(connection->isGone());
    EXPECT_FALSE(connection->write("x"));
}

TEST_F(ClientConnectionTest, AStopEndsTheWait) {
    std::thread later([this] {
        std::this_thread::sleep_for(10ms);
        stop.raise();
    });
    const auto begin = Clock::now();
    send("GET / HT");
    EXPECT_EQ(connection->readHead(20s), ClientConnection::NONE);
    EXPECT_LT(Clock::now() - begin, 5s);
    later.join();
    EXPECT_TRUE(connection->write("an answer under way is sent")) << "whatever was asked before";
}

} // namespace
